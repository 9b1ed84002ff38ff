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

std::string rangeSyntax(const std::string& text) {
    const auto range = parseRange(text);
    if (!range) return "not an index or a range A:B: " + text;
    if (range->first && range->last && *range->first >= 0 && *range->last >= 0 && *range->last < *range->first) {
        return "the range " + text + " ends before it begins";
    }
    return {};
}

// The forms --time takes: a time step, a range, a date or two joined by "/".
std::string timeSyntax(const std::string& text) {
    if (parseRange(text)) return rangeSyntax(text);
    const size_t slash = text.find('/');
    const auto dateOrEmpty = [](const std::string& part) { return part.empty() || parseDateTime(part).has_value(); };
    if (slash != std::string::npos && text != "/" && dateOrEmpty(text.substr(0, slash)) &&
        dateOrEmpty(text.substr(slash + 1))) {
        return {};
    }
    if (slash == std::string::npos && parseDateTime(text)) return {};
    return "not a time step, a range A:B or a date (2024-03-22T06:00, or two joined by /): " + text;
}

// A count of 0 or more (CLI11's own range check would name the largest double).
std::string countSyntax(const std::string& text) {
    const auto range = parseRange(text);
    if (!range || !range->first || range->first != range->last || *range->first < 0) {
        return "a number of values, 0 or more: " + text;
    }
    return {};
}

// The selection options of dump and stats.
void addSelection(CLI::App* cmd, Selection& select) {
    cmd->add_option("--item", select.items,
                    "items by number or name (exact, else a unique beginning, any case); repeat it or list them "
                    "with commas")
        ->type_name("ITEM");
    cmd->add_option("--time,--step,--steps", select.time,
                    "time steps: T, A:B (inclusive; negative from the end), a date 2024-03-22T06:00 or a date "
                    "range FROM/TO")
        ->type_name("WHEN")
        ->check(CLI::Validator(timeSyntax, "WHEN"));
    cmd->add_flag("--nearest", select.nearest, "a date takes the nearest time step instead of an exact one");
    static const char* const kAxes[] = {"--x", "--y", "--z"};
    for (size_t d = 0; d < 3; ++d) {
        cmd->add_option(kAxes[d], select.axes[d], std::string("grid indices in the ") + (kAxes[d] + 2) +
                                                      " direction: I or A:B (0-based, inclusive)")
            ->type_name("A:B")
            ->check(CLI::Validator(rangeSyntax, "A:B"));
    }
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

    infoCmd->add_option("--item", info.item, "one item in full (axis coordinates, statistics), by number or name");

    DumpOptions dump;
    std::string dumpFormat = "text";
    CLI::App* dumpCmd = app.add_subcommand("dump", "Values of a gridded data file, by item, time step and cell");
    dumpCmd->add_option("FILE", dump.file, "the gridded data file")->required();
    addSelection(dumpCmd, dump.select);
    dumpCmd->add_option("--static", dump.staticItem, "static item N or NAME instead of time steps")
        ->type_name("ITEM")
        ->excludes("--item")
        ->excludes("--time")
        ->excludes("--nearest");
    dumpCmd->add_option("--format", dumpFormat, "text or csv")->check(CLI::IsMember({"text", "csv"}));
    dumpCmd->add_option("--limit", dump.limit, "at most N values per item and time step")
        ->check(CLI::Validator(countSyntax, "N"));

    StatsOptions stats;
    CLI::App* statsCmd =
        app.add_subcommand("stats", "Min, max, mean and delete count per item, read from every time step");
    statsCmd->add_option("FILE", stats.file, "the gridded data file")->required();
    addSelection(statsCmd, stats.select);
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

    // plot is the Python package's: its options pass through untouched.
    CLI::App* plotCmd = app.add_subcommand("plot", "Picture of an item at a time step (PNG, through Python)");
    plotCmd->prefix_command();
    plotCmd->set_help_flag();

    UnitsOptions units;
    std::string unitsQuery;
    CLI::App* unitsCmd = app.add_subcommand("units", "Quantities and their units");
    CLI::Option* queryOpt =
        unitsCmd->add_option("QUERY", unitsQuery, "part of a quantity's key text or description, or its number");
    unitsCmd->add_flag("--json", units.json, "print JSON instead of text");

    DemoOptions demo;
    CLI::App* demoCmd = app.add_subcommand("demo", "Write a sample gridded data file");
    demoCmd->add_option("OUT", demo.out, "the file to write")->capture_default_str();

    CLI::App* convertCmd = app.add_subcommand(
        "convert", "Convert netCDF (CF) to a gridded data file or back (python3 -m tova convert)");
    convertCmd->set_help_flag();  // --help goes to the converter with the other arguments
    convertCmd->prefix_command();

    // CLI11 would call an unknown subcommand a stray argument; name it.
    if (argc > 1 && argv[1][0] != '-' &&
        app.get_subcommands([&](CLI::App* sub) { return sub->get_name() == argv[1]; }).empty()) {
        std::fprintf(stderr,
                     "tova: unknown subcommand \"%s\" (info, dump, stats, plot, check, repair, units, demo, convert)\n"
                     "Run with --help for more information.\n",
                     argv[1]);
        return kExitUsage;
    }

    try {
        app.parse(argc, argv);
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
        dump.format = dumpFormat == "csv" ? DumpFormat::Csv : DumpFormat::Text;
        return runDump(dump);
    }
    if (statsCmd->parsed()) return runStats(stats);
    if (plotCmd->parsed()) return runPlot(plotCmd->remaining());
    if (demoCmd->parsed()) return runDemo(demo);
    if (convertCmd->parsed()) return runConvert(convertCmd->remaining());
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
