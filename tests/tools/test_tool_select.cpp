// What dump, stats, info and plot work on: items by number or name, time
// steps by number, range or date, cells by index ranges, with a sentence
// naming the valid values for anything out of range; and the pictures of
// `tova plot`.
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <cstdlib>
#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "tool_test.h"

using tooltest::runTova;

namespace {

std::vector<std::vector<std::string>> csvRows(const std::string& text) {
    std::vector<std::vector<std::string>> rows;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) {
        std::vector<std::string> cells;
        size_t begin = 0;
        for (size_t comma; (comma = line.find(',', begin)) != std::string::npos; begin = comma + 1) {
            cells.push_back(line.substr(begin, comma - begin));
        }
        cells.push_back(line.substr(begin));
        rows.push_back(cells);
    }
    return rows;
}

// Column c of the data rows of a dump as CSV.
std::vector<std::string> column(const tooltest::Run& run, size_t c) {
    std::vector<std::string> values;
    const auto rows = csvRows(run.out);
    for (size_t r = 1; r < rows.size(); ++r) values.push_back(rows[r].at(c));
    return values;
}

using Strings = std::vector<std::string>;

// The sample of tool_test.h: 5 time steps every 30 minutes from 2024-03-21
// 06:00; "level" on a 4 x 3 grid, "flux" of 5 values; static "depth", "flags".
class ToolSelect : public ::testing::Test {
protected:
    void SetUp() override { tooltest::writeGridFile(path, 5); }
    tooltest::Run dump(Strings args) {
        args.insert(args.begin(), {"dump", path, "--format", "csv"});
        return runTova(args);
    }
    void fails(const Strings& args, const std::string& phrase) {
        const tooltest::Run run = runTova(args);
        EXPECT_EQ(run.exitCode, 1) << args[0] << " " << args.back() << "\n" << run.err;
        EXPECT_NE(run.err.find(phrase), std::string::npos) << run.err;
    }
    testutil::TempDir dir;
    std::string path = dir.file("a.grd");
};

TEST_F(ToolSelect, ItemsByNumberOrNameInTheOrderGiven) {
    EXPECT_EQ(column(dump({"--item", "LEVEL", "--time", "0"}), 2), Strings(12, "1"));
    EXPECT_EQ(column(dump({"--item", "Le", "--time", "0"}), 2), Strings(12, "1"));  // a unique beginning
    Strings both(5, "2");
    both.insert(both.end(), 12, "1");
    EXPECT_EQ(column(dump({"--item", "fl,1", "--time", "0"}), 2), both);
    EXPECT_EQ(column(dump({"--item", "flux", "--item", "level", "--time", "0"}), 2), both);
    fails({"dump", path, "--item", "depth"}, "has no item named \"depth\"; its items: 1 \"level\", 2 \"flux\"");
    fails({"stats", path, "--item", "3"}, "has no item 3 (items 1 to 2: 1 \"level\", 2 \"flux\")");
}

TEST_F(ToolSelect, TimeStepsByNumberRangeOrDate) {
    EXPECT_EQ(column(dump({"--item", "flux", "--time", "2024-03-21T07:00", "--x", "0"}), 0), Strings{"2"});
    EXPECT_EQ(column(dump({"--item", "flux", "--time", "2024-03-21 07:00:00", "--x", "0"}), 1),
              Strings{"2024-03-21 07:00:00"});
    EXPECT_EQ(column(dump({"--item", "flux", "--time", "2024-03-21T07:10", "--nearest", "--x", "0"}), 0),
              Strings{"2"});
    EXPECT_EQ(column(dump({"--item", "flux", "--time", "2024-03-21T06:30/2024-03-21T07:30", "--x", "0"}), 0),
              (Strings{"1", "2", "3"}));
    EXPECT_EQ(column(dump({"--item", "flux", "--time", "-2:", "--x", "0"}), 0), (Strings{"3", "4"}));
    EXPECT_EQ(column(dump({"--item", "flux", "--step", "1", "--x", "0"}), 0), Strings{"1"});
    fails({"dump", path, "--time", "2024-03-21T07:10"},
          "no time step at 2024-03-21 07:10:00: the nearest are time step 2 (2024-03-21 07:00:00) and time step 3 "
          "(2024-03-21 07:30:00); --nearest takes the closer one");
    fails({"dump", path, "--time", "2024-03-22T00:00", "--nearest"},
          "2024-03-22 00:00:00 is after the last time step; the time steps run from 2024-03-21 06:00:00 to "
          "2024-03-21 08:00:00");
    fails({"stats", path, "--time", "3:9"}, "holds time steps 0 to 4; time step 9 is not there");
}

TEST_F(ToolSelect, CellsByIndexRangesAlsoForStaticItemsAndStats) {
    // level: value 0.25 e + t - 1, elements 0 and 5 deleted; x runs fastest.
    const tooltest::Run box = dump({"--item", "level", "--time", "2", "--x", "1:2", "--y", "1"});
    EXPECT_EQ(column(box, 3), (Strings{"5", "6"}));
    EXPECT_EQ(column(box, 7), (Strings{"", "2.5"}));
    EXPECT_EQ(column(dump({"--static", "FLAGS", "--x", "3:"}), 5), (Strings{"13", "14"}));

    const nlohmann::json stats = nlohmann::json::parse(
        runTova({"stats", path, "--item", "level", "--time", "1:2", "--x", "1", "--y", "0:1", "--json"}).out);
    const nlohmann::json& row = stats["computed"][0];
    EXPECT_EQ(row["values"], 2);
    EXPECT_EQ(row["deletes"], 2);
    EXPECT_EQ(row["minimum"].get<double>(), 0.25);
    EXPECT_EQ(row["maximum"].get<double>(), 1.25);
    EXPECT_FALSE(stats.contains("stored"));  // the file's statistics cover every value

    fails({"dump", path, "--item", "level", "--x", "4"}, "--x 4: item 1 \"level\" has x indices 0 to 3");
    fails({"dump", path, "--item", "flux", "--y", "0"}, "--y 0: item 2 \"flux\" has no y direction (NeqD1)");
}

TEST_F(ToolSelect, InfoShowsOneItemInFull) {
    const tooltest::Run run = runTova({"info", path, "--item", "lev", "--json"});
    ASSERT_EQ(run.exitCode, 0) << run.err;
    const nlohmann::json item = nlohmann::json::parse(run.out);
    EXPECT_EQ(item["item"], 1);
    EXPECT_EQ(item["name"], "level");
    EXPECT_EQ(item["coordinates"]["x"]["first"], 100.0);
    EXPECT_EQ(item["coordinates"]["x"]["last"], 250.0);
    EXPECT_EQ(item["time"]["steps"], 5);
    EXPECT_EQ(item["time"]["last"], "2024-03-21 08:00:00");
    EXPECT_EQ(item["statistics"]["deletes"], 10);
    const nlohmann::json flux = nlohmann::json::parse(runTova({"info", path, "--item", "2", "--json"}).out);
    EXPECT_EQ(flux["coordinates"]["x"].size(), 6u);  // a non-equidistant axis: its cell boundaries
}

// tova plot runs the Python package: a PNG without a display.
TEST_F(ToolSelect, PlotWritesAPicture) {
    if (std::system("/usr/bin/python3 -c 'import matplotlib, numpy' 2>/dev/null") != 0) {
        GTEST_SKIP() << "no Python 3 with matplotlib";
    }
    const std::string out = dir.file("level.png");
    unsetenv("DISPLAY");
    const tooltest::Run run = runTova({"plot", path, "--item", "level", "--time", "2024-03-21T07:00", "-o", out});
    ASSERT_EQ(run.exitCode, 0) << run.err;
    EXPECT_NE(run.out.find("level drawn into " + out), std::string::npos) << run.out;
    std::ifstream png(out, std::ios::binary);
    char magic[8] = {};
    png.read(magic, 8);
    EXPECT_EQ(std::string(magic, 8), std::string("\x89PNG\r\n\x1a\n", 8));
    fails({"plot", path, "--static", "nothing"}, "no static item named \"nothing\"");
}

}  // namespace
