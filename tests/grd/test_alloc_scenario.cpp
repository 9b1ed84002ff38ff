// Allocation failures over a whole scenario: writing a rich data file
// (header, static item, compressed and plain items, several time steps,
// close) and reading it back completely (static item, every time step,
// statistics, searches, close), with the n-th allocation of the library
// failing for n = 1, 2, ... until the scenario runs past its last
// allocation. The countdown covers the data layer and the record layer
// (files, record buffers, block nodes). Each failing run ends with a
// non-zero status and reports the failure (2000, or the block layer's own
// code where it meets it), or absorbs the failure and reads back
// everything; either way it closes and frees everything (the sanitizer build
// checks for leaks).
#include <gtest/gtest.h>

#include <algorithm>

#include "common/testutil.h"
#include "rcf/rcf_internal.h"
#include "test_harden_support.h"
#include "test_header_support.h"

namespace {

class AllocationScenario : public grdtest::GrdTest {};

TEST_F(AllocationScenario, EveryFailingAllocationEndsTheRunWithAStatusAndLeavesNothingOpen) {
    testutil::TempDir dir;
    const std::string path = dir.file("rich.grd");
    // The undisturbed run, for comparison.
    ASSERT_TRUE(hardtest::writeRichFile(path).ok());
    const hardtest::Contents clean = hardtest::readEverything(path);
    ASSERT_TRUE(clean.run.ok());
    ASSERT_TRUE(takeCodes().empty());

    int32_t failedRuns = 0;
    int32_t memoryReports = 0;
    int32_t nth = 1;
    for (; nth < 5000; ++nth) {
        rcfTestFailAllocation(nth);
        const hardtest::Run written = hardtest::writeRichFile(path);
        const hardtest::Contents read = hardtest::readEverything(path);
        const bool fired = rcfTestFailAllocation(0) == 0;
        const std::vector<int32_t> codes = takeCodes();
        if (!fired) {
            // Past the last allocation: the run is the clean one.
            EXPECT_TRUE(written.ok()) << nth;
            EXPECT_TRUE(read.run.ok()) << nth;
            EXPECT_EQ(read.values, clean.values);
            EXPECT_TRUE(codes.empty()) << nth;
            break;
        }
        // Either the failure shows (a failing call, 2000 reported), or it
        // was absorbed (a stream without a buffer of its own) and the run
        // is the clean one.
        if (!written.ok() || !read.run.ok()) {
            ++failedRuns;
            // Reported through the handler: 2000 mostly; where the block
            // layer meets the failure, its own code (2010 for a record node,
            // 2019 for a block that could not be read whole).
            EXPECT_FALSE(codes.empty()) << nth << " write " << written.firstFailure << " read " << read.run.firstFailure;
            if (std::find(codes.begin(), codes.end(), F_ERR_MEMORY) != codes.end()) ++memoryReports;
        } else {
            EXPECT_EQ(read.values, clean.values) << nth;
            EXPECT_EQ(read.times, clean.times) << nth;
            EXPECT_EQ(read.staticItems, clean.staticItems) << nth;
        }
        if (HasFailure()) break;
    }
    EXPECT_LT(nth, 5000) << "the scenario never ran past its allocations";
    EXPECT_GT(failedRuns, 50);
    EXPECT_GT(memoryReports, failedRuns / 3);
}

}  // namespace
