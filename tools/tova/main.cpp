// The tova command-line tool: subcommands and their options (CLI11), and the
// exit codes: 0 success, 1 a damaged file or a command that failed, 2 bad
// usage. Each subcommand lives in its own source file; tova_cli::run() is
// the entry that the executable's main() calls.
#include <cstdio>
#include <exception>
#include <new>
#include <string>

#include <CLI/CLI.hpp>

#include "grd_commands.h"
#include "tova/rcf.h"
#include "tova_cli.h"

#ifndef TOVA_CLI_VERSION
#define TOVA_CLI_VERSION "unknown"
#endif

namespace {

using namespace tova_cli;

// "A:B", "A:", ":B" or "A" with 0 <= A <= B.
StepRange parseSteps(const std::string& text) {
    const auto number = [&](const std::string& part) -> int64_t {
        size_t used = 0;
        int64_t value = -1;
        try {
            value = std::stoll(part, &used);
        } catch (const std::exception&) {
            used = 0;
        }
        if (used != part.size() || value < 0) throw CLI::ValidationError("--steps", "not a time-step range: " + text);
        return value;
    };
    StepRange range;
    const size_t colon = text.find(':');
    if (colon == std::string::npos) {
        range.first = number(text);
        range.last = range.first;
        return range;
    }
    const std::string first = text.substr(0, colon);
    const std::string last = text.substr(colon + 1);
    if (!first.empty()) range.first = number(first);
    if (!last.empty()) range.last = number(last);
    if (range.last && *range.last < range.first) {
        throw CLI::ValidationError("--steps", "the range " + text + " ends before it begins");
    }
    return range;
}

std::string versionText() {
    return std::string("tova ") + TOVA_CLI_VERSION + " (record-file layer " + std::to_string(rcfGetVersionCurrent()) +
           ")";
}

int dispatch(int argc, char** argv) {
    CLI::App app{"Looks into the data files of the tova library: gridded data, cross sections, VRE files.", "tova"};
    app.set_version_flag("--version", versionText());
    app.require_subcommand(1);
    app.footer(
        "Exit status: 0 success, 1 damaged file or failed command, 2 bad usage.\n"
        "Run `tova SUBCOMMAND --help` for the options of a subcommand.");

    InfoOptions info;
    CLI::App* infoCmd = app.add_subcommand("info", "Summary of a file: kind, header, versions and contents");
    infoCmd->add_option("FILE", info.file, "the file to describe")->required();
    infoCmd->add_flag("--json", info.json, "print JSON instead of text");

    DumpOptions dump;
    int32_t dumpItem = 0;
    int64_t dumpStep = 0;
    std::string dumpSteps;
    int32_t dumpStatic = 0;
    std::string dumpFormat = "text";
    CLI::App* dumpCmd = app.add_subcommand("dump", "Values of a gridded data file");
    dumpCmd->add_option("FILE", dump.file, "the gridded data file")->required();
    CLI::Option* itemOpt = dumpCmd->add_option("--item", dumpItem, "only item N (1-based)")->check(CLI::PositiveNumber);
    CLI::Option* stepOpt =
        dumpCmd->add_option("--step", dumpStep, "only time step T (0-based)")->check(CLI::NonNegativeNumber);
    CLI::Option* stepsOpt = dumpCmd->add_option("--steps", dumpSteps, "time steps A to B (0-based, inclusive)")
                                ->type_name("A:B")
                                ->excludes(stepOpt);
    CLI::Option* staticOpt =
        dumpCmd->add_option("--static", dumpStatic, "static item N (1-based) instead of time steps")
            ->check(CLI::PositiveNumber)
            ->excludes(itemOpt)
            ->excludes(stepOpt)
            ->excludes(stepsOpt);
    dumpCmd->add_option("--format", dumpFormat, "text or csv")->check(CLI::IsMember({"text", "csv"}));
    int64_t dumpLimit = 0;
    CLI::Option* limitOpt = dumpCmd->add_option("--limit", dumpLimit, "at most N values per item and time step")
                                ->check(CLI::NonNegativeNumber);

    StatsOptions stats;
    int32_t statsItem = 0;
    CLI::App* statsCmd = app.add_subcommand("stats", "Min, max, mean and delete count per item of a gridded file");
    statsCmd->add_option("FILE", stats.file, "the gridded data file")->required();
    CLI::Option* statsItemOpt =
        statsCmd->add_option("--item", statsItem, "only item N (1-based)")->check(CLI::PositiveNumber);
    statsCmd->add_flag("--json", stats.json, "print JSON instead of text");

    CheckOptions check;
    CLI::App* checkCmd = app.add_subcommand("check", "Structural check of a file; exit status 1 when it is damaged");
    checkCmd->add_option("FILE", check.file, "the file to check")->required();
    checkCmd->footer(
        "Exit status 0 for a sound file, also when warnings are printed: a gridded data file whose header counts "
        "fewer time steps than it holds, or that ends with an unfinished time step (a writer that was killed), is "
        "repairable with `tova repair FILE`; 1 when the file is damaged.");

    RepairOptions repair;
    CLI::App* repairCmd =
        app.add_subcommand("repair", "Bring the header of a gridded data file up to date after a crashed run");
    repairCmd->add_option("FILE", repair.file, "the gridded data file")->required();
    repairCmd->add_flag("--dry-run", repair.dryRun, "report what would be repaired, change nothing");
    repairCmd->footer("Exit status 0 when the file is consistent afterwards, 1 when it cannot be repaired.");

    UnitsOptions units;
    std::string unitsQuery;
    CLI::App* unitsCmd = app.add_subcommand("units", "Quantities and their units");
    CLI::Option* queryOpt =
        unitsCmd->add_option("QUERY", unitsQuery, "part of a quantity's key text or description, or its number");
    unitsCmd->add_flag("--json", units.json, "print JSON instead of text");

    DemoOptions demo;
    CLI::App* demoCmd = app.add_subcommand("demo", "Write a sample gridded data file");
    demoCmd->add_option("OUT", demo.out, "the file to write")->capture_default_str();

    // CLI11 would call an unknown subcommand a stray argument; name it.
    if (argc > 1 && argv[1][0] != '-' &&
        app.get_subcommands([&](CLI::App* sub) { return sub->get_name() == argv[1]; }).empty()) {
        std::fprintf(stderr,
                     "tova: unknown subcommand \"%s\" (info, check, repair, units, dump, stats, demo)\n"
                     "Run with --help for more information.\n",
                     argv[1]);
        return kExitUsage;
    }

    try {
        app.parse(argc, argv);
        if (stepsOpt->count() != 0) dump.steps = parseSteps(dumpSteps);
    } catch (const CLI::ParseError& e) {
        const int code = app.exit(e);  // prints help, the version or the error
        return code == 0 ? kExitOk : kExitUsage;
    }

    if (infoCmd->parsed()) return runInfo(info);
    if (checkCmd->parsed()) return runCheck(check);
    if (repairCmd->parsed()) return runRepair(repair);
    if (unitsCmd->parsed()) {
        if (queryOpt->count() != 0) units.query = unitsQuery;
        return runUnits(units);
    }
    if (dumpCmd->parsed()) {
        if (itemOpt->count() != 0) dump.item = dumpItem;
        if (stepOpt->count() != 0) dump.steps = StepRange{dumpStep, dumpStep};
        if (staticOpt->count() != 0) dump.staticItem = dumpStatic;
        if (limitOpt->count() != 0) dump.limit = dumpLimit;
        dump.format = dumpFormat == "csv" ? DumpFormat::Csv : DumpFormat::Text;
        return runDump(dump);
    }
    if (statsCmd->parsed()) {
        if (statsItemOpt->count() != 0) stats.item = statsItem;
        return runStats(stats);
    }
    if (demoCmd->parsed()) return runDemo(demo);
    return kExitUsage;
}

}  // namespace

int tova_cli::run(int argc, char** argv) {
    try {
        return dispatch(argc, argv);
    } catch (const Failure& e) {
        std::fprintf(stderr, "tova: %s\n", e.what());
    } catch (const std::bad_alloc&) {
        std::fprintf(stderr, "tova: out of memory\n");
    } catch (const std::exception& e) {
        std::fprintf(stderr, "tova: unexpected failure: %s\n", e.what());
    }
    return kExitFailed;
}
