// Write failures: under a file size limit (a full disk behaves alike) every
// lost write comes back as a status, never silently, and a close that
// cannot complete the file refuses to close it. Each case runs in a forked
// child with RLIMIT_FSIZE set and SIGXFSZ ignored, and sends its statuses
// back through a pipe.
#ifndef _WIN32  // file size limits and fork are POSIX

#include <gtest/gtest.h>

#include <csignal>
#include <cerrno>
#include <cstdint>
#include <cstring>
#include <filesystem>
#include <functional>
#include <vector>

#include <sys/mount.h>
#include <sys/resource.h>
#include <sys/wait.h>
#include <unistd.h>

#include "test_harden_support.h"
#include "test_lifecycle_support.h"

using namespace grdtest;

namespace {

constexpr rlim_t kLimit = 64 * 1024;

std::vector<int32_t> inLimitedChild(rlim_t limit, const std::function<std::vector<int32_t>()>& body) {
    int fds[2];
    if (pipe(fds) != 0) return {};
    const pid_t pid = fork();
    if (pid == 0) {
        ::close(fds[0]);
        std::signal(SIGXFSZ, SIG_IGN);
        const rlimit rl{limit, limit};
        setrlimit(RLIMIT_FSIZE, &rl);
        const std::vector<int32_t> results = body();
        const ssize_t bytes = static_cast<ssize_t>(results.size() * sizeof(int32_t));
        const bool sent = write(fds[1], results.data(), static_cast<size_t>(bytes)) == bytes;
        _exit(sent ? 0 : 1);  // no exit handlers: the child owns nothing of the parent's
    }
    ::close(fds[1]);
    std::vector<int32_t> results;
    int32_t value = 0;
    while (read(fds[0], &value, sizeof value) == static_cast<ssize_t>(sizeof value)) results.push_back(value);
    ::close(fds[0]);
    int wstatus = 0;
    waitpid(pid, &wstatus, 0);
    EXPECT_TRUE(WIFEXITED(wstatus) && WEXITSTATUS(wstatus) == 0);
    return results;
}

class WriteFailureTest : public FileTest {
protected:
    // Creates path and writes one float static item of n elements; gives the
    // statuses of the write and of the close, and whether the file was still
    // open after the close (it is then released through the record layer).
    std::vector<int32_t> writeAndClose(const std::string& path, int32_t n) {
        std::vector<int32_t> r;
        if (grdFileCreate(path.c_str(), header_, &file_) != 0) return {-1};
        StaticItem item;
        grdSetItemInfo(header_, item.get(), QTY_ITEM_UNDEFINED, "big", 0, RCF_FLOAT);
        grdSetItemAxisEqD1(item.get(), 0, n, 0.0f, 1.0f);
        const std::vector<float> values(static_cast<size_t>(n), 1.0f);
        r.push_back(grdStaticWrite(item.get(), file_, values.data()));
        r.push_back(grdFileClose(header_, &file_));
        r.push_back(file_ != nullptr ? 1 : 0);
        if (file_ != nullptr) rcfFileClose(&file_);
        return r;
    }
};

TEST_F(WriteFailureTest, WriteBeyondTheLimitIsAStatus) {
    makeFileHeader();
    // Larger than the stream buffer: the write itself fails.
    const std::vector<int32_t> big =
        inLimitedChild(kLimit, [&] { return writeAndClose(dir_.file("big.grd"), 1 << 19); });
    ASSERT_EQ(big.size(), 3u);
    EXPECT_EQ(big[0], 2002);
    EXPECT_NE(big[1], 0);  // never a successful close of an incomplete file
}

TEST_F(WriteFailureTest, BufferedDataThatCannotReachTheDiskFailsTheClose) {
    makeFileHeader();
    // Fits the stream buffer, so the write seems to succeed; the close must not.
    const std::vector<int32_t> small =
        inLimitedChild(kLimit, [&] { return writeAndClose(dir_.file("small.grd"), 40000); });
    ASSERT_EQ(small.size(), 3u);
    EXPECT_EQ(small[0], 0);
    EXPECT_NE(small[1], 0);
    EXPECT_EQ(small[2], 1);  // the close refused: the file stayed open
}

TEST_F(WriteFailureTest, CreateThatCannotWriteItsHeaderLeavesNothing) {
    makeFileHeader();
    const std::string path = dir_.file("tiny.grd");
    const std::vector<int32_t> r = inLimitedChild(100, [&] {
        FileHandle file = reinterpret_cast<FileHandle>(0x1);
        const int32_t status = grdFileCreate(path.c_str(), header_, &file);
        return std::vector<int32_t>{status, file == nullptr ? 1 : 0};
    });
    ASSERT_EQ(r.size(), 2u);
    EXPECT_NE(r[0], 0);
    EXPECT_EQ(r[1], 1);
    EXPECT_FALSE(std::filesystem::exists(path));
}


// Time steps under the limit: two float items of 40000 values (160 kB a
// record, most of the stream buffer) per step on an equidistant 1-D axis;
// the limit falls inside step 3. The write that crosses it gives 2002 and
// the steps before stay readable.
// A file test of two float items of N values each on an equidistant 1-D axis.
template <int32_t N>
class TwoItemFile : public FileTest {
protected:
    static constexpr int32_t kValues = N;

    void SetUp() override {
        FileTest::SetUp();
        makeFileHeader(2);
        for (int32_t i = 1; i <= 2; ++i) ASSERT_EQ(grdSetItemAxisEqD1(grdItemD(header_, i), 0, kValues, 0.0f, 1.0f), 0);
    }

    static std::vector<float> values(int32_t step, int32_t item) {
        std::vector<float> v(kValues);
        for (int32_t e = 0; e < kValues; ++e) v[size_t(e)] = static_cast<float>(hardtest::richValue(step, item, e));
        return v;
    }
};

class DynamicWriteFailure : public TwoItemFile<40000> {
protected:
    static constexpr int32_t kSteps = 6;
};

TEST_F(DynamicWriteFailure, TheCrossingWriteGives2002TheFileClosesAndEarlierStepsReadBack) {
    const std::string path = dir_.file("steps.grd");
    // Statuses sent back: each write's, until the first failure; then the
    // close's and whether the handle was left open.
    const std::vector<int32_t> r = inLimitedChild(3 * 320 * 1024, [&] {
        std::vector<int32_t> out;
        FileHandle file = nullptr;
        if (grdFileCreate(path.c_str(), header_, &file) != 0) return std::vector<int32_t>{-1};
        int32_t status = 0;
        for (int32_t s = 0; s < kSteps && status == 0; ++s) {
            for (int32_t i = 1; i <= 2 && status == 0; ++i) {
                status = grdWriteItemTimeStep(header_, file, s, values(s, i).data());
                out.push_back(status);
            }
        }
        out.push_back(grdFileClose(header_, &file));
        out.push_back(file != nullptr ? 1 : 0);
        if (file != nullptr) rcfFileClose(&file);
        return out;
    });
    ASSERT_GE(r.size(), 3u);
    const std::vector<int32_t> writes(r.begin(), r.end() - 2);
    const int32_t closed = r[r.size() - 2];
    const bool leftOpen = r.back() != 0;
    // The writes succeed up to the one that crossed the limit: 2002 there.
    ASSERT_EQ(writes.back(), 2002);
    for (size_t k = 0; k + 1 < writes.size(); ++k) EXPECT_EQ(writes[k], 0) << k;
    const auto completeSteps = static_cast<int32_t>((writes.size() - 1) / 2);
    EXPECT_GE(completeSteps, 2);
    EXPECT_LT(completeSteps, kSteps);
    // The close reports the incomplete file, but does not keep the handle.
    EXPECT_NE(closed, 0);
    EXPECT_FALSE(leftOpen);

    // Every step written before the failure reads back.
    openRead(path);
    int32_t unit = 0, steps = 0, first = 0;
    double start = 0, step = 0;
    ASSERT_EQ(grdGetEqTimeAxis(header_, &unit, nullptr, &start, &step, &steps, &first), 0);
    EXPECT_EQ(steps, completeSteps);
    std::vector<float> got(kValues);
    for (int32_t s = 0; s < completeSteps; ++s) {
        for (int32_t i = 1; i <= 2; ++i) {
            double time = -1;
            ASSERT_EQ(grdReadItemTimeStep(header_, file_, &time, got.data()), 0) << s << " " << i;
            EXPECT_EQ(got, values(s, i)) << s << " " << i;
        }
    }
    close();
}


// Acknowledged time steps when the file cannot grow: a writer that flushes
// after every time step learns from the flush (or the write) of the first
// step that did not reach the file, never later, whatever the one-second
// throttle of the header update decides; every step acknowledged before
// (its writes and its flush returned 0) reads back after recovery. Steps of
// 8 kB fit the stream's buffer many times over.
class AcknowledgedSteps : public TwoItemFile<1000> {
protected:
    // Writes and flushes steps until a call fails, then drops the file as a
    // crashed writer would; gives the steps acknowledged and the failure.
    std::vector<int32_t> writeUntilFull(const std::string& path) {
        FileHandle file = nullptr;
        if (grdFileCreate(path.c_str(), header_, &file) != 0) return {-1, -1};
        int32_t acknowledged = 0, status = 0;
        for (int32_t s = 0; s < 4000 && status == 0; ++s) {
            for (int32_t i = 1; i <= 2 && status == 0; ++i)
                status = grdWriteItemTimeStep(header_, file, s, values(s, i).data());
            if (status == 0) status = grdFileFlush(header_, file);
            if (status == 0) acknowledged = s + 1;
        }
        rcfFileClose(&file);
        return {acknowledged, status};
    }
    void expectAcknowledgedStepsBack(const std::string& path, const std::vector<int32_t>& run) {
        ASSERT_EQ(run.size(), 2u);
        const int32_t acknowledged = run[0];
        EXPECT_GE(acknowledged, 2);
        EXPECT_TRUE(run[1] == 2002 || run[1] == 2005) << run[1];
        int32_t found = -1, inHeader = -1;
        ASSERT_EQ(grdFileRecover(path.c_str(), &found, &inHeader), 0);
        EXPECT_GE(found, acknowledged);
        openRead(path);
        std::vector<float> got(kValues);
        for (int32_t s = 0; s < acknowledged && !HasFailure(); ++s)
            for (int32_t i = 1; i <= 2; ++i) {
                double time = -1;
                ASSERT_EQ(grdReadItemTimeStep(header_, file_, &time, got.data()), 0) << s << " " << i;
                EXPECT_EQ(got, values(s, i)) << s << " " << i;
            }
        close();
    }
};

TEST_F(AcknowledgedSteps, UnderAFileSizeLimitEveryAcknowledgedStepIsRecovered) {
    const std::string path = dir_.file("limited.grd");
    expectAcknowledgedStepsBack(path, inLimitedChild(kLimit, [&] { return writeUntilFull(path); }));
}

// The file system's size is no multiple of the stream's buffer: the buffer
// that fills it holds acknowledged steps that do not fit.
TEST_F(AcknowledgedSteps, OnAFullFileSystemEveryAcknowledgedStepIsRecovered) {
    const std::string mountPoint = dir_.file("small");
    std::filesystem::create_directory(mountPoint);
    if (mount("tmpfs", mountPoint.c_str(), "tmpfs", 0, "size=600k") != 0)
        GTEST_SKIP() << "no small file system to fill: mounting a tmpfs failed (" << std::strerror(errno) << ")";
    struct Unmount {
        std::string at;
        ~Unmount() { umount(at.c_str()); }
    } unmount{mountPoint};
    const std::string path = mountPoint + "/full.grd";
    expectAcknowledgedStepsBack(path, writeUntilFull(path));
}

TEST_F(AcknowledgedSteps, SyncPutsTheHeaderUpToDateAtOnce) {
    const std::string path = dir_.file("synced.grd");
    create(path);
    for (int32_t s = 0; s < 5; ++s)
        for (int32_t i = 1; i <= 2; ++i) ASSERT_EQ(grdWriteItemTimeStep(header_, file_, s, values(s, i).data()), 0);
    // The throttle holds the header back; a sync does not wait for it.
    ASSERT_EQ(grdFileFlush(header_, file_), 0);
    ASSERT_EQ(grdFileSync(header_, file_), 0);
    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    ASSERT_EQ(grdFileRead(path.c_str(), &h, &f), 0);
    int32_t steps = -1;
    grdGetEqTimeAxis(h, nullptr, nullptr, nullptr, nullptr, &steps, nullptr);
    EXPECT_EQ(steps, 5);
    EXPECT_EQ(grdFileSync(h, f), 2015);  // nothing to put on the device from a reader
    grdFileClose(h, &f);
    grdHeaderDestroy(&h);
    close();
    EXPECT_EQ(takeCodes(), std::vector<int32_t>{2015});
}

}  // namespace

#endif  // _WIN32
