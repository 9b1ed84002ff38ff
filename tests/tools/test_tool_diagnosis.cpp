// A damaged file read by info, stats or dump: each says what check says (what
// is wrong, where, whether repair helps) and still shows what can be read.
// Progress lines on a terminal, and never without one.
#include <gtest/gtest.h>

#include <cstdio>
#include <cstdlib>
#include <string>
#include <vector>

#include "tool_test.h"

using tooltest::runTova;

namespace {

bool contains(const std::string& text, const std::string& part) { return text.find(part) != std::string::npos; }

TEST(ToolDiagnosis, InfoStatsAndDumpSayWhatCheckSays) {
    testutil::TempDir dir;
    const std::string path = dir.file("cut.grd");
    tooltest::writeGridFile(path, 3);
    std::vector<uint8_t> bytes = testutil::readBytes(path);
    bytes.resize(bytes.size() - 60);  // inside the last time step, which the header counts
    testutil::writeBytes(path, bytes);

    const tooltest::Run check = runTova({"check", path});
    ASSERT_EQ(check.exitCode, 1);
    const std::string damaged = check.out.substr(0, check.out.find('\n') + 1);
    const std::string note = "note: the header counts 3 time steps, 2 are whole: `tova repair " + path + "`";
    ASSERT_TRUE(contains(check.out, note)) << check.out;

    const tooltest::Run info = runTova({"info", path});
    EXPECT_EQ(info.exitCode, 1);
    EXPECT_TRUE(contains(info.out, "timeSteps    3\n")) << info.out;  // the header as it is
    EXPECT_TRUE(contains(info.out, damaged) && contains(info.out, note)) << info.out;

    const tooltest::Run stats = runTova({"stats", path});
    EXPECT_EQ(stats.exitCode, 1);
    EXPECT_TRUE(contains(stats.out, "timeSteps       2\n")) << stats.out;  // the whole steps
    EXPECT_TRUE(contains(stats.err, "tova: " + damaged) && contains(stats.err, note)) << stats.err;

    const tooltest::Run dump = runTova({"dump", path, "--item", "flux", "--format", "csv"});
    EXPECT_EQ(dump.exitCode, 1);
    EXPECT_TRUE(contains(dump.out, "\n1,2024-03-21 06:30:00,2,4,4,,,8\n")) << dump.out;  // what could be read
    EXPECT_TRUE(contains(dump.err, "tova: " + damaged) && contains(dump.err, note)) << dump.err;
}

// Standard error of the tool run under a pseudo-terminal (script), with
// progress forced for small files.
std::string onTerminal(const std::string& args) {
    const std::string command = "TOVA_PROGRESS=always script -qec '" + std::string(TOVA_CLI_PATH) + " " + args +
                                " > /dev/null' /dev/null";
    std::string out;
    if (std::FILE* p = popen(command.c_str(), "r")) {
        char buffer[4096];
        for (size_t n; (n = std::fread(buffer, 1, sizeof(buffer), p)) > 0;) out.append(buffer, n);
        pclose(p);
    }
    return out;
}

TEST(ToolProgress, ByBytesOnATerminalOnly) {
    if (std::system("script -qec true /dev/null > /dev/null 2>&1") != 0) GTEST_SKIP() << "no script(1)";
    testutil::TempDir dir;
    const std::string path = dir.file("a.grd");
    tooltest::writeGridFile(path, 3);
    for (const auto& [args, label] : std::vector<std::pair<std::string, std::string>>{
             {"check " + path, "\rchecking "},
             {"stats " + path, "\rreading "},
             {"repair --dry-run " + path, "\rchecking "},
             {"dump --format csv " + path, "\rdumping "}}) {
        const std::string err = onTerminal(args);
        EXPECT_TRUE(contains(err, label) && contains(err, " MB of ")) << args << ": " << err;
    }
    setenv("TOVA_PROGRESS", "always", 1);
    const tooltest::Run piped = runTova({"check", path});
    unsetenv("TOVA_PROGRESS");
    EXPECT_EQ(piped.exitCode, 0);
    EXPECT_EQ(piped.err, "");
}

}  // namespace
