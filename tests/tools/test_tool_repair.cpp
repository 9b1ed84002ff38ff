// `tova repair` and `tova check` on the files a crashed writer leaves: a
// header that counts fewer time steps than the data holds and an unfinished
// time step at the end are reported as repairable, repaired in place, and a
// repaired file checks clean; files that cannot be repaired give status 1.
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "tool_test.h"

using tooltest::runTova;

namespace {

bool has(const tooltest::Run& run, const std::string& text) { return run.out.find(text) != std::string::npos; }

// A file whose header counts 2 time steps while 3 complete ones and half of
// a fourth follow: the bytes of a 2-step file, then the third step and half
// of it again, taken from a 3-step file of the same layout.
std::vector<uint8_t> crashedFile(testutil::TempDir& dir) {
    const std::string two = dir.file("two.grd");
    const std::string three = dir.file("three.grd");
    tooltest::writeGridFile(two, 2);
    tooltest::writeGridFile(three, 3);
    std::vector<uint8_t> bytes = testutil::readBytes(two);
    const std::vector<uint8_t> more = testutil::readBytes(three);
    const size_t step = more.size() - bytes.size();
    const size_t begin = bytes.size();
    bytes.insert(bytes.end(), more.begin() + static_cast<std::ptrdiff_t>(begin), more.end());
    bytes.insert(bytes.end(), more.begin() + static_cast<std::ptrdiff_t>(begin),
                 more.begin() + static_cast<std::ptrdiff_t>(begin + step / 2));
    return bytes;
}

TEST(ToolRepair, CrashedFileIsRepairable) {
    testutil::TempDir dir;
    const std::string path = dir.file("run.grd");
    const std::vector<uint8_t> crashed = crashedFile(dir);
    testutil::writeBytes(path, crashed);

    tooltest::Run run = runTova({"check", path});
    EXPECT_EQ(run.exitCode, 0) << run.out;
    EXPECT_TRUE(has(run, "warning: an unfinished time step (")) << run.out;
    EXPECT_TRUE(has(run, "the header says 2 time steps, the data holds 3 complete ones")) << run.out;
    EXPECT_TRUE(has(run, "repairable: run `tova repair " + path + "`")) << run.out;

    run = runTova({"repair", path, "--dry-run"});
    EXPECT_EQ(run.exitCode, 0) << run.out;
    EXPECT_TRUE(has(run, path + ": header says 2 time steps, file holds 3 complete steps and a partial one")) << run.out;
    EXPECT_TRUE(has(run, "; would repair\n")) << run.out;
    EXPECT_EQ(testutil::readBytes(path), crashed);
    // info shows the header as it is, with what check says of it.
    EXPECT_TRUE(has(runTova({"info", path}), "\nwarning: the header says 2 time steps, the data holds 3 complete ones"));

    run = runTova({"repair", path});
    EXPECT_EQ(run.exitCode, 0) << run.out;
    EXPECT_TRUE(has(run, "; repaired\n")) << run.out;
    EXPECT_EQ(testutil::readBytes(path).size(), crashed.size());  // the unfinished step stays
    EXPECT_TRUE(has(runTova({"info", path}), "timeSteps    3\n"));

    const std::vector<uint8_t> repaired = testutil::readBytes(path);
    run = runTova({"repair", path});
    EXPECT_EQ(run.exitCode, 0) << run.out;
    EXPECT_TRUE(has(run, "header says 3 time steps, file holds 3 complete steps and a partial one")) << run.out;
    EXPECT_TRUE(has(run, "; nothing to repair\n")) << run.out;
    EXPECT_EQ(testutil::readBytes(path), repaired);

    run = runTova({"check", path});
    EXPECT_EQ(run.exitCode, 0) << run.out;
    EXPECT_TRUE(has(run, "warning: an unfinished time step (")) << run.out;
    EXPECT_FALSE(has(run, "the header says")) << run.out;
}

// A file cut short inside a time step its header counts has lost data: it
// is damaged, and check says what repair can keep; repair then makes it
// consistent with its whole time steps.
TEST(ToolRepair, FileCutInsideCountedStepIsDamagedButKeepsItsWholeSteps) {
    testutil::TempDir dir;
    const std::string path = dir.file("cut.grd");
    tooltest::writeGridFile(path, 3);
    const std::string two = dir.file("two.grd");
    tooltest::writeGridFile(two, 2);
    const size_t twoSteps = testutil::readBytes(two).size();
    std::vector<uint8_t> bytes = testutil::readBytes(path);
    bytes.resize(twoSteps + (bytes.size() - twoSteps) / 2);
    testutil::writeBytes(path, bytes);

    tooltest::Run run = runTova({"check", path});
    EXPECT_EQ(run.exitCode, 1) << run.out;
    EXPECT_TRUE(has(run, ": damaged at offset ")) << run.out;
    EXPECT_TRUE(has(run, "note: the header counts 3 time steps, 2 are whole: `tova repair " + path + "`")) << run.out;

    run = runTova({"repair", path});
    EXPECT_EQ(run.exitCode, 0) << run.out;
    EXPECT_TRUE(has(run, "header says 3 time steps, file holds 2 complete steps and a partial one")) << run.out;
    EXPECT_TRUE(has(runTova({"info", path}), "timeSteps    2\n"));
    EXPECT_EQ(runTova({"check", path}).exitCode, 0);
}

// check and repair say the same of a file cut anywhere: check names repair
// exactly when repair then changes the header, and once repair has run, check
// finds nothing left for it (and repair agrees).
TEST(ToolRepair, CheckAndRepairAgreeWhereverTheFileIsCut) {
    testutil::TempDir dir;
    const std::string whole = dir.file("whole.grd");
    tooltest::writeGridFile(whole, 4);
    const std::vector<uint8_t> bytes = testutil::readBytes(whole);
    const tooltest::Layout layout = tooltest::walkLayout(whole);
    const std::string path = dir.file("cut.grd");
    // Cuts every 31 bytes from the header on, and at every record and block
    // boundary of the time steps (each a 50001 block of 4 bytes, a float
    // record of 12 and a double record of 5: 102 bytes).
    std::vector<size_t> cuts;
    for (size_t cut = layout.appBase + 3; cut < bytes.size(); cut += 31) cuts.push_back(cut);
    for (const int64_t b : layout.boundaries) {
        if (b >= static_cast<int64_t>(bytes.size()) - 4 * 102 - 4 && b < static_cast<int64_t>(bytes.size())) {
            cuts.push_back(static_cast<size_t>(b));
        }
    }
    for (const size_t cut : cuts) {
        testutil::writeBytes(path, std::vector<uint8_t>(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(cut)));
        const std::string at = "cut at " + std::to_string(cut);
        const tooltest::Run check = runTova({"check", path});
        const bool named = has(check, "tova repair");
        const tooltest::Run repair = runTova({"repair", path});
        ASSERT_TRUE(check.clean() && repair.clean()) << at;
        if (named) {
            EXPECT_EQ(repair.exitCode, 0) << at << "\n" << check.out << repair.out;
            EXPECT_TRUE(has(repair, "; repaired\n")) << at << "\n" << check.out << repair.out;
        } else {
            EXPECT_FALSE(has(repair, "; repaired\n")) << at << "\n" << check.out << repair.out;
            EXPECT_EQ(repair.exitCode, check.exitCode) << at << "\n" << check.out << repair.out;
        }
        if (repair.exitCode != 0) continue;
        const tooltest::Run after = runTova({"check", path});
        EXPECT_EQ(after.exitCode, 0) << at << "\n" << after.out;
        EXPECT_FALSE(has(after, "tova repair")) << at << "\n" << after.out;
        EXPECT_TRUE(has(runTova({"repair", path}), "; nothing to repair\n")) << at;
    }
}

TEST(ToolRepair, WhatCannotBeRepaired) {
    testutil::TempDir dir;
    const std::string vre = dir.file("a.vre");
    tooltest::writeVreFile(vre);
    tooltest::Run run = runTova({"repair", vre});
    EXPECT_EQ(run.exitCode, 1);
    EXPECT_TRUE(has(run, "not a gridded data file")) << run.out;

    // Cut inside the header stream: damaged before any time step.
    const std::string grid = dir.file("cut.grd");
    tooltest::writeGridFile(grid, 2);
    const std::vector<uint8_t> bytes = testutil::readBytes(grid);
    const tooltest::Layout layout = tooltest::walkLayout(grid);
    testutil::writeBytes(grid, std::vector<uint8_t>(bytes.begin(), bytes.begin() + layout.appBase + 40));
    run = runTova({"repair", grid});
    EXPECT_EQ(run.exitCode, 1) << run.out;
    EXPECT_TRUE(has(run, "cannot be repaired")) << run.out;
    EXPECT_TRUE(run.clean());
}

}  // namespace
