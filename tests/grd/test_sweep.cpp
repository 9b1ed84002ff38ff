// Damaged files: a small but rich data file (static item, compressed item,
// per-element statistics, calendar axis, several time steps) cut at every
// byte offset, and with every byte changed in turn, is opened and read
// through the API. Nothing may crash or leak (the sanitizer build checks),
// every status is one of the library's, every failure went through the
// handler, and a cut file never reads as complete.
#include <gtest/gtest.h>

#include <algorithm>
#include <set>

#include "common/testutil.h"
#include "test_harden_support.h"
#include "test_header_support.h"

namespace {

using hardtest::Contents;

// Codes a call may return: 1 is the end of the file (a read past the last
// time step, an open of a file shorter than a record-file header).
bool knownStatus(int32_t status) {
    return status == 0 || status == 1 || status == 1000 || status == 1001 || status == 1002 ||
           (status >= 2000 && status <= 2020);
}

class Sweep : public grdtest::GrdTest {
protected:
    void SetUp() override {
        GrdTest::SetUp();
        const hardtest::Run written = hardtest::writeRichFile(source_);
        ASSERT_TRUE(written.ok()) << written.firstFailure;
        bytes_ = testutil::readBytes(source_);
        grdtest::reports().clear();
        // The whole file reads completely and cleanly.
        const Contents whole = hardtest::readEverything(source_);
        ASSERT_TRUE(whole.run.ok()) << whole.run.firstFailure;
        ASSERT_EQ(whole.stepsRead, hardtest::kRichSteps);
        ASSERT_EQ(whole.staticItems, 1);
        ASSERT_TRUE(grdtest::reports().empty());
    }

    // Reads damaged bytes; checks what every damaged run must show and gives
    // what was read.
    Contents readDamaged(const std::vector<uint8_t>& damaged, const std::string& what) {
        testutil::writeBytes(damaged_, damaged);
        grdtest::reports().clear();
        Contents c = hardtest::readEverything(damaged_);
        for (int32_t status : c.run.statuses) {
            EXPECT_TRUE(knownStatus(status)) << what << ": status " << status;
            if (!knownStatus(status)) break;
        }
        // A failing file (anything but the end of the file and the
        // unreported search results) has been reported.
        const int32_t first = c.run.firstFailure;
        const bool reportable = first != 0 && first != 1 && first != 1001 && first != 1002;
        if (reportable) {
            EXPECT_FALSE(grdtest::reports().empty()) << what << ": " << c.run.firstFailure << " unreported";
        }
        return c;
    }

    testutil::TempDir dir_;
    std::string source_ = dir_.file("rich.grd");
    std::string damaged_ = dir_.file("damaged.grd");
    std::vector<uint8_t> bytes_;
};

TEST_F(Sweep, FileCutAtEveryOffsetFailsWithAStatusAndNeverReadsAsComplete) {
    ASSERT_LT(bytes_.size(), 4000u);  // keeps the sweep short
    std::set<int32_t> seen;
    for (size_t cut = 0; cut < bytes_.size(); ++cut) {
        const std::vector<uint8_t> part(bytes_.begin(), bytes_.begin() + static_cast<std::ptrdiff_t>(cut));
        const Contents c = readDamaged(part, "cut at " + std::to_string(cut));
        EXPECT_FALSE(c.run.ok()) << "a file cut at " << cut << " of " << bytes_.size() << " read as complete";
        seen.insert(c.run.firstFailure);
        if (HasFailure()) break;
    }
    // The cuts end in the header, the static item and the dynamic data: more
    // than one kind of failure.
    EXPECT_GE(seen.size(), 2u);
}

TEST_F(Sweep, EveryByteChangedInTurnGivesStatusesOnly) {
    int failing = 0;
    for (uint8_t pattern : {uint8_t{0xFF}, uint8_t{0x01}}) {
        std::vector<uint8_t> changed = bytes_;
        for (size_t at = 0; at < bytes_.size(); ++at) {
            changed[at] ^= pattern;
            const Contents c = readDamaged(changed, "byte " + std::to_string(at) + " ^ " + std::to_string(pattern));
            changed[at] = bytes_[at];
            if (!c.run.ok()) ++failing;
            if (HasFailure()) return;
        }
    }
    // The headers, tags and counts of the file are checked: many changes fail.
    EXPECT_GT(failing, static_cast<int>(bytes_.size()) / 4);
}

}  // namespace
