// The command line of the tova tool: usage errors, help, version, the unit
// table, and what the gridded-data commands refuse.
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include "qty/qty.h"
#include "tool_test.h"

using tooltest::runTova;

TEST(ToolUsage, BadCommandLinesExitWithTwoAndSayWhy) {
    const std::vector<std::vector<std::string>> bad = {
        {},                                              // no subcommand
        {"frobnicate"},                                  // unknown subcommand
        {"info"},                                        // FILE missing
        {"info", "a", "b"},                              // one FILE too many
        {"info", "--colour", "x"},                       // unknown option
        {"check"},                                       // FILE missing
        {"units", "--json", "a", "b"},                   // one QUERY too many
        {"dump", "f", "--format", "xml"},                // not text or csv
        {"dump", "f", "--step", "1", "--steps", "1:2"},  // one or the other
        {"dump", "f", "--steps", "5:2"},                 // ends before it begins
        {"dump", "f", "--steps", "x:2"},                 // not a number
        {"dump", "f", "--time", "2024-13-01"},           // no date
        {"dump", "f", "--x", "3:1"},                     // ends before it begins
        {"dump", "f", "--static", "1", "--step", "0"},   // static items have no steps
        {"stats", "f", "--y", "a"},                      // not an index
    };
    for (const auto& args : bad) {
        const tooltest::Run run = runTova(args);
        const std::string line = args.empty() ? "(none)" : args[0] + (args.size() > 1 ? " " + args[1] : "");
        EXPECT_EQ(run.exitCode, 2) << line << "\n" << run.err;
        EXPECT_FALSE(run.err.empty()) << line;
        EXPECT_TRUE(run.out.empty()) << line;
    }
    EXPECT_NE(runTova({"frobnicate"}).err.find("frobnicate"), std::string::npos);
    EXPECT_NE(runTova({"dump", "f", "--limit", "-1"}).err.find("--limit: a number of values, 0 or more: -1"),
              std::string::npos);
}

TEST(ToolUsage, HelpAndVersionExitWithZero) {
    const tooltest::Run help = runTova({"--help"});
    EXPECT_EQ(help.exitCode, 0);
    // One line per command.
    for (const char* sub : {"info", "dump", "stats", "plot", "check", "repair", "units", "demo"}) {
        EXPECT_NE(help.out.find("\n  " + std::string(sub) + " "), std::string::npos) << sub;
    }
    const tooltest::Run subHelp = runTova({"dump", "--help"});
    EXPECT_EQ(subHelp.exitCode, 0);
    EXPECT_NE(subHelp.out.find("--steps"), std::string::npos);

    const tooltest::Run version = runTova({"--version"});
    EXPECT_EQ(version.exitCode, 0);
    EXPECT_EQ(version.out.rfind("tova ", 0), 0u) << version.out;
}

TEST(ToolUsage, GriddedCommandsRefuseWhatTheFileDoesNotHold) {
    testutil::TempDir dir;
    const std::string grd = dir.file("a.grd");
    const std::string vre = dir.file("a.vre");
    tooltest::writeGridFile(grd);
    tooltest::writeVreFile(vre);
    const std::vector<std::pair<std::vector<std::string>, std::string>> cases = {
        {{"dump", dir.file("missing.grd")}, "cannot open"},
        {{"stats", dir.file("missing.grd")}, "cannot open"},
        {{"dump", vre}, "no gridded data file"},
        {{"stats", vre, "--item", "1"}, "no gridded data file"},
        {{"dump", grd, "--item", "3"}, "has no item 3 (items 1 to 2: 1 \"level\", 2 \"flux\")"},
        {{"dump", grd, "--item", "0"}, "has no item 0 (items 1 to 2"},
        {{"stats", grd, "--item", "9"}, "has no item 9"},
        {{"dump", grd, "--step", "3"}, "holds time steps 0 to 2; time step 3 is not there"},
        {{"dump", grd, "--steps", "1:7"}, "time step 7 is not there"},
        {{"dump", grd, "--static", "3"}, "has no static item 3"},
        {{"demo", dir.file("a.grd/sub/x.grd")}, "demo: creating"},
    };
    for (const auto& [args, phrase] : cases) {
        const tooltest::Run run = runTova(args);
        EXPECT_EQ(run.exitCode, 1) << args[0] << " " << args[1] << "\n" << run.err;
        EXPECT_TRUE(run.out.empty()) << run.out;
        EXPECT_NE(run.err.find(phrase), std::string::npos) << run.err;
    }
    // A static item has no item number or time steps of its own.
    EXPECT_EQ(runTova({"dump", grd, "--static", "1", "--item", "1"}).exitCode, 2);
    EXPECT_EQ(runTova({"dump", grd, "--limit", "-1"}).exitCode, 2);
}

TEST(ToolUnits, ListsEveryQuantityWithItsUnits) {
    const tooltest::Run all = runTova({"units"});
    ASSERT_EQ(all.exitCode, 0) << all.err;
    // One line per quantity and one with its units.
    const auto lines = std::count(all.out.begin(), all.out.end(), '\n');
    EXPECT_EQ(lines, 2 * qtyGetItemTypeCount());
    EXPECT_NE(all.out.find("GravityAcceleration (110244): Acceleration of gravity\n  m/s^2 (20800)"),
              std::string::npos);

    const tooltest::Run json = runTova({"units", "--json"});
    ASSERT_EQ(json.exitCode, 0);
    const nlohmann::json doc = nlohmann::json::parse(json.out);
    ASSERT_EQ(doc["quantities"].size(), static_cast<size_t>(qtyGetItemTypeCount()));
    for (const auto& q : doc["quantities"]) {
        const int32_t key = q["key"].get<int32_t>();
        EXPECT_EQ(q["units"].size(), static_cast<size_t>(qtyGetItemUnitCount(key))) << key;
        const char* text = nullptr;
        ASSERT_TRUE(qtyGetItemTypeKey(key, &text));
        EXPECT_EQ(q["name"], text);
        for (const auto& u : q["units"]) EXPECT_TRUE(qtyItemUnitEqv(key, u["key"].get<int32_t>())) << key;
    }
}

TEST(ToolUnits, QueryMatchesKeyTextDescriptionOrNumberWithoutRegardToCase) {
    const nlohmann::json byText = nlohmann::json::parse(runTova({"units", "--json", "gRaViTy"}).out);
    ASSERT_FALSE(byText["quantities"].empty());
    for (const auto& q : byText["quantities"]) {
        std::string all = q["name"].get<std::string>() + q["description"].get<std::string>();
        std::transform(all.begin(), all.end(), all.begin(), ::tolower);
        EXPECT_NE(all.find("gravity"), std::string::npos) << all;
    }
    const nlohmann::json byNumber = nlohmann::json::parse(runTova({"units", "110244", "--json"}).out);
    ASSERT_EQ(byNumber["quantities"].size(), 1u);
    EXPECT_EQ(byNumber["quantities"][0]["name"], "GravityAcceleration");

    const tooltest::Run none = runTova({"units", "no-such-quantity"});
    EXPECT_EQ(none.exitCode, 1);
    EXPECT_TRUE(none.out.empty());
    EXPECT_NE(none.err.find("no-such-quantity"), std::string::npos);
}
