// Recovery after a crash: files left by a writer that stopped without closing
// (snapshots of the bytes on disk, cuts at every offset, and writers killed
// with SIGKILL) are recovered to every complete time step, read back with
// the values written, and appended to.
#include <gtest/gtest.h>

#include <csignal>
#include <cstdint>
#include <filesystem>
#include <functional>
#include <random>
#include <string>
#include <vector>

#include "test_lifecycle_support.h"
#if TOVA_TEST_POSIX
#include <sys/wait.h>
#include <unistd.h>
#endif

using namespace grdtest;
namespace fs = std::filesystem;

namespace {

constexpr int32_t kItems = 2;
constexpr int32_t kElements = 5;

// The value of element e of item n (1-based) at time step t, and the time of
// step t on a non-equidistant axis.
float valueOf(int32_t t, int32_t n, int32_t e) { return static_cast<float>(1000 * t + 100 * n + e); }
double timeOf(int32_t t) { return 10.0 + 2.5 * t + 0.25 * (t % 3); }

// Creates path with kItems float items of `elements` values; file type 1
// (equidistant) or 4 (non-equidistant), statistics type statsType.
void createFile(const std::string& path, int32_t fileType, HeaderHandle* header, FileHandle* file,
                int32_t elements = kElements, int32_t statsType = 1) {
    ASSERT_EQ(grdHeaderCreate(fileType, "crash", "test", 1, kItems, statsType, header), 0);
    if (fileType == F_EQTIME_FIXEDSPACE_ALLITEMS) {
        ASSERT_EQ(grdSetEqTimeAxis(*header, QTY_UNIT_SECOND, 0.0, 60.0, 0), 0);
    } else {
        ASSERT_EQ(grdSetNeqTimeAxis(*header, QTY_UNIT_SECOND, 0.0, 0), 0);
    }
    for (int32_t n = 1; n <= kItems; ++n) {
        ItemHandle item = grdItemD(*header, n);
        ASSERT_EQ(grdSetItemInfo(*header, item, QTY_ITEM_UNDEFINED, "v", 0, RCF_FLOAT), 0);
        ASSERT_EQ(grdSetItemAxisEqD1(item, 0, elements, 0.0f, 1.0f), 0);
    }
    ASSERT_EQ(grdFileCreate(path.c_str(), *header, file), 0);
}

int32_t elementsOf(HeaderHandle header) { return static_cast<int32_t>(grdGetItemElements(grdItemD(header, 1))); }

// Writes time step t; with items < kItems only that many items of it.
int32_t writeStep(HeaderHandle header, FileHandle file, int32_t t, int32_t items = kItems) {
    std::vector<float> values(static_cast<size_t>(elementsOf(header)));
    for (int32_t n = 1; n <= items; ++n) {
        for (size_t e = 0; e < values.size(); ++e) values[e] = valueOf(t, n, static_cast<int32_t>(e));
        const int32_t status = grdWriteItemTimeStep(header, file, timeOf(t), values.data());
        if (status != 0) return status;
    }
    return 0;
}

// Reads path and checks that it holds exactly `steps` time steps of the
// values (and, for file type 4, times and time span) written.
void expectSteps(const std::string& path, int32_t steps) {
    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    ASSERT_EQ(grdFileRead(path.c_str(), &h, &f), 0) << path;
    const bool neq = grdGetFileType(h) == F_NEQTIME_FIXEDSPACE_ALLITEMS;
    int32_t count = -1;
    if (neq) {
        double start = 0, span = 0;
        grdGetNeqTimeAxis(h, nullptr, nullptr, &start, &span, &count, nullptr);
        if (steps > 0) {
            EXPECT_EQ(start, timeOf(0));
            EXPECT_EQ(start + span, timeOf(steps - 1));
        }
        grdParamModifyTimes(h, 0);  // absolute times
    } else {
        grdGetEqTimeAxis(h, nullptr, nullptr, nullptr, nullptr, &count, nullptr);
    }
    EXPECT_EQ(count, steps) << path;
    std::vector<float> values(static_cast<size_t>(elementsOf(h)));
    for (int32_t t = 0; t < count && !testing::Test::HasFailure(); ++t) {
        for (int32_t n = 1; n <= kItems; ++n) {
            double time = 0;
            ASSERT_EQ(grdReadItemTimeStep(h, f, &time, values.data()), 0) << "step " << t;
            if (neq) {
                EXPECT_EQ(time, timeOf(t));
            }
            for (size_t e = 0; e < values.size(); ++e)
                ASSERT_EQ(values[e], valueOf(t, n, static_cast<int32_t>(e))) << t << " " << n << " " << e;
        }
    }
    grdFileClose(h, &f);
    grdHeaderDestroy(&h);
}

// Appends `more` time steps after the complete ones and closes.
void appendSteps(const std::string& path, int32_t more) {
    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    ASSERT_EQ(grdFileAppend(path.c_str(), &h, &f), 0);
    const int32_t first = h->timeStepsDone;
    for (int32_t t = first; t < first + more; ++t) ASSERT_EQ(writeStep(h, f, t), 0);
    ASSERT_EQ(grdFileClose(h, &f), 0);
    grdHeaderDestroy(&h);
}

class RecoverTest : public GrdTest {
protected:
    // Copies the open file as a crash leaves it (what reached the stream),
    // then drops the writer without the close's header update.
    static void abandon(const std::string& path, const std::string& crashed, HeaderHandle* h, FileHandle* f) {
        ASSERT_EQ(std::fflush((*f)->stream), 0);
        fs::remove(crashed);  // MinGW's copy_file cannot overwrite
        fs::copy_file(path, crashed);
        rcfFileClose(f);
        grdHeaderDestroy(h);
    }

    testutil::TempDir dir_;
};

// A writer's file as a crash leaves it: the bytes written so far, the header
// as of its last update. Recovery counts the complete steps, rewrites the
// header, and a second recovery finds nothing to do and changes no byte.
TEST_F(RecoverTest, HeaderBehindItsDataIsBroughtUpToDate) {
    for (const int32_t fileType : {F_EQTIME_FIXEDSPACE_ALLITEMS, F_NEQTIME_FIXEDSPACE_ALLITEMS}) {
        const std::string path = dir_.file("live.grd");
        const std::string crashed = dir_.file("crashed.grd");
        HeaderHandle h = nullptr;
        FileHandle f = nullptr;
        createFile(path, fileType, &h, &f);
        for (int32_t t = 0; t < 2; ++t) ASSERT_EQ(writeStep(h, f, t), 0);
        f->openClock -= 2000;  // the last flush was long ago: this one counts 2 steps
        ASSERT_EQ(grdFileFlush(h, f), 0);
        f->openClock = rcfClockMs();  // every later flush falls within the second
        for (int32_t t = 2; t < 7; ++t) {
            ASSERT_EQ(writeStep(h, f, t), 0);
            ASSERT_EQ(grdFileFlush(h, f), 0);
        }
        ASSERT_EQ(writeStep(h, f, 7, 1), 0);  // half a time step
        abandon(path, crashed, &h, &f);

        int32_t found = -1, inHeader = -1;
        int64_t tail = -1;
        ASSERT_EQ(grdFileScan(crashed.c_str(), &found, &inHeader, &tail), 0);
        EXPECT_EQ(found, 7);
        EXPECT_EQ(inHeader, 2);
        EXPECT_EQ(tail, 4 + (fileType == F_NEQTIME_FIXEDSPACE_ALLITEMS ? 13 : 0) + 5 + 4 * kElements);
        const std::vector<uint8_t> before = testutil::readBytes(crashed);
        ASSERT_EQ(grdFileRecover(crashed.c_str(), &found, &inHeader), 0);
        EXPECT_EQ(found, 7);
        EXPECT_EQ(inHeader, 2);
        EXPECT_EQ(testutil::readBytes(crashed).size(), before.size());  // the partial step stays
        expectSteps(crashed, 7);

        const std::vector<uint8_t> recovered = testutil::readBytes(crashed);
        ASSERT_EQ(grdFileRecover(crashed.c_str(), nullptr, nullptr), 0);
        EXPECT_EQ(testutil::readBytes(crashed), recovered);  // consistent: untouched

        appendSteps(crashed, 2);  // replaces the partial step
        expectSteps(crashed, 9);
        ASSERT_EQ(grdFileScan(crashed.c_str(), &found, &inHeader, &tail), 0);
        EXPECT_EQ(found, 9);
        EXPECT_EQ(inHeader, 9);
        EXPECT_EQ(tail, 0);
    }
    EXPECT_EQ(takeCodes(), Codes{});
}

// Appending to a crashed file that was not recovered continues after its
// complete steps too, and the close leaves the header right.
TEST_F(RecoverTest, AppendWithoutRecoveryContinuesAfterTheCompleteSteps) {
    const std::string path = dir_.file("live.grd");
    const std::string crashed = dir_.file("crashed.grd");
    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    createFile(path, F_NEQTIME_FIXEDSPACE_ALLITEMS, &h, &f);
    for (int32_t t = 0; t < 4; ++t) ASSERT_EQ(writeStep(h, f, t), 0);
    abandon(path, crashed, &h, &f);

    appendSteps(crashed, 3);
    expectSteps(crashed, 7);
    EXPECT_EQ(takeCodes(), Codes{});
}

// Cut at every offset inside the dynamic data: recovery finds the steps that
// end before the cut, the file reads back, and appending yields a whole file.
TEST_F(RecoverTest, EveryCutRecoversTheCompleteSteps) {
    const std::string path = dir_.file("whole.grd");
    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    createFile(path, F_EQTIME_FIXEDSPACE_ALLITEMS, &h, &f);
    const int64_t dataStart = rcfTell64(f) + 4;  // after the 50000 block
    for (int32_t t = 0; t < 3; ++t) ASSERT_EQ(writeStep(h, f, t), 0);
    ASSERT_EQ(grdFileClose(h, &f), 0);
    grdHeaderDestroy(&h);
    const std::vector<uint8_t> whole = testutil::readBytes(path);
    const int64_t stepLength = 4 + kItems * (5 + 4 * kElements);
    ASSERT_EQ(static_cast<int64_t>(whole.size()), dataStart + 3 * stepLength);

    const std::string cut = dir_.file("cut.grd");
    for (int64_t end = dataStart; end < static_cast<int64_t>(whole.size()); ++end) {
        testutil::writeBytes(cut, std::vector<uint8_t>(whole.begin(), whole.begin() + end));
        const int32_t complete = static_cast<int32_t>((end - dataStart) / stepLength);
        int32_t found = -1, inHeader = -1;
        ASSERT_EQ(grdFileRecover(cut.c_str(), &found, &inHeader), 0) << end;
        EXPECT_EQ(found, complete) << end;
        EXPECT_EQ(inHeader, 3);
        expectSteps(cut, complete);
        appendSteps(cut, 1);
        expectSteps(cut, complete + 1);
        EXPECT_EQ(fs::file_size(cut), static_cast<uintmax_t>(dataStart + (complete + 1) * stepLength)) << end;
        if (HasFailure()) break;
    }
    EXPECT_EQ(takeCodes(), Codes{});
}

// Records that are not what the header describes end the walk: a record of
// another type, or of another count, in step 1 leaves step 0 only.
TEST_F(RecoverTest, ForeignRecordsEndTheWalk) {
    const auto make = [&](const std::string& path, int32_t type, uint32_t count) {
        HeaderHandle h = nullptr;
        FileHandle f = nullptr;
        createFile(path, F_EQTIME_FIXEDSPACE_ALLITEMS, &h, &f);
        ASSERT_EQ(writeStep(h, f, 0), 0);
        ASSERT_EQ(grdCheckWriteLB(h, kTagTimeStep, nullptr, f, "test", 0), 0);
        const std::vector<int32_t> zeros(count, 0);  // 4-byte zeros serve both types
        ASSERT_EQ(rcfLrecWrite(f, type, count, zeros.data()), 0);
        const float more[kElements] = {};
        ASSERT_EQ(rcfLrecWrite(f, RCF_FLOAT, kElements, more), 0);
        rcfFileClose(&f);
        grdHeaderDestroy(&h);
    };
    const std::string typed = dir_.file("typed.grd");
    const std::string counted = dir_.file("counted.grd");
    make(typed, RCF_INT4, kElements);
    make(counted, RCF_FLOAT, kElements + 1);
    for (const std::string& file : {typed, counted}) {
        int32_t found = -1;
        int64_t tail = 0;
        ASSERT_EQ(grdFileScan(file.c_str(), &found, nullptr, &tail), 0);
        EXPECT_EQ(found, 1);
        EXPECT_GT(tail, 0);
    }
    const std::string path = typed;
    // Bad names and files damaged before their dynamic data: the reader's codes.
    EXPECT_EQ(grdFileRecover(dir_.file("missing.grd").c_str(), nullptr, nullptr), 2003);
    std::vector<uint8_t> bytes = testutil::readBytes(path);
    testutil::writeBytes(path, std::vector<uint8_t>(bytes.begin(), bytes.begin() + 120));
    EXPECT_NE(grdFileRecover(path.c_str(), nullptr, nullptr), 0);
    takeCodes();
}

// Writers killed with SIGKILL at random moments while they write and flush:
// every complete step reads back as written, and appending after recovery
// gives a valid file.
#if TOVA_TEST_POSIX
struct KillPlan {
    int trials = 24;
    int32_t elements = kElements;
    int32_t statsType = 1;
    int maxDelayUs = 80000;
    // Trial k rewrites the header every updateEvery(k) steps (a second has
    // passed then), flushing every flushEvery steps.
    std::function<int32_t(int)> updateEvery;
    int32_t flushEvery = 7;
};

void killWriters(const testutil::TempDir& dir, const KillPlan& plan) {
    std::mt19937 random(20240321);
    for (int trial = 0; trial < plan.trials; ++trial) {
        const int32_t fileType = trial % 2 == 0 ? F_EQTIME_FIXEDSPACE_ALLITEMS : F_NEQTIME_FIXEDSPACE_ALLITEMS;
        const std::string path = dir.file("killed" + std::to_string(trial) + ".grd");
        const int32_t updateEvery = plan.updateEvery(trial);
        int ready[2];
        ASSERT_EQ(pipe(ready), 0);
        const pid_t child = fork();
        ASSERT_GE(child, 0);
        if (child == 0) {
            close(ready[0]);
            HeaderHandle h = nullptr;
            FileHandle f = nullptr;
            createFile(path, fileType, &h, &f, plan.elements, plan.statsType);
            // The header on disk before the parent's clock starts: a writer
            // killed before that leaves nothing to recover.
            if (f == nullptr || grdFileFlush(h, f) != 0) _exit(2);
            const char go = 1;
            if (write(ready[1], &go, 1) != 1) _exit(2);
            for (int32_t t = 0; t < 200000; ++t) {
                if (writeStep(h, f, t) != 0) _exit(3);
                // Flushes as a model run calls them; now and then a second
                // has passed, and the header is rewritten.
                if (t % updateEvery == 0) f->openClock -= 2000;
                if (t % plan.flushEvery == 0 && grdFileFlush(h, f) != 0) _exit(3);
                if (t % 20 == 0) usleep(100);
            }
            _exit(4);  // not reached within the kill delay
        }
        close(ready[1]);
        char go = 0;
        ASSERT_EQ(read(ready[0], &go, 1), 1);  // the file exists
        close(ready[0]);
        std::uniform_int_distribution<int> delayUs(0, plan.maxDelayUs);
        usleep(static_cast<useconds_t>(delayUs(random)));
        kill(child, SIGKILL);
        int wstatus = 0;
        ASSERT_EQ(waitpid(child, &wstatus, 0), child);
        ASSERT_TRUE(WIFSIGNALED(wstatus)) << "trial " << trial << ": the writer ended by itself";

        int32_t found = -1, inHeader = -1;
        ASSERT_EQ(grdFileRecover(path.c_str(), &found, &inHeader), 0) << "trial " << trial;
        EXPECT_LE(inHeader, found);
        expectSteps(path, found);
        appendSteps(path, 3);
        expectSteps(path, found + 3);
        int64_t tail = -1;
        ASSERT_EQ(grdFileScan(path.c_str(), &found, &inHeader, &tail), 0);
        EXPECT_EQ(found, inHeader);
        EXPECT_EQ(tail, 0);
        if (testing::Test::HasFailure()) break;
        fs::remove(path);
    }
}

#endif

TEST_F(RecoverTest, WritersKilledAtRandomMoments) {
#if !TOVA_TEST_POSIX
    TOVA_TEST_SKIP_WITHOUT_POSIX();
#else
    KillPlan plan;
    // Header updates between every few and every few thousand steps: the
    // stream's buffer overflows in between, leaving unfinished steps.
    plan.updateEvery = [](int trial) { return 97 + 400 * trial; };
    killWriters(dir_, plan);
    EXPECT_EQ(takeCodes(), Codes{});
#endif
}

// Writers whose header is rewritten at every step and is large (per-element
// statistics: 2 x 1.4 MB that change at every step), so that they spend most
// of their time writing it back: most kills fall inside that write, leaving
// blocks part old, part new.
TEST_F(RecoverTest, WritersKilledWhileTheirHeaderIsRewritten) {
#if !TOVA_TEST_POSIX
    TOVA_TEST_SKIP_WITHOUT_POSIX();
#else
    KillPlan plan;
    plan.trials = 12;
    plan.elements = 20000;
    plan.statsType = F_ITEM_STATS_ELEMENT;
    plan.maxDelayUs = 150000;
    plan.updateEvery = [](int) { return 1; };
    plan.flushEvery = 1;
    killWriters(dir_, plan);
    EXPECT_EQ(takeCodes(), Codes{});
#endif
}

}  // namespace
