// Threads: distinct files are independent. Eight threads at once each create,
// write, close, open and read back their own record file (through the
// file-open layer, whose failures reach the process-wide handler table),
// gridded data files (one with items large enough for the statistics' helper
// thread), VRE file and cross-section file, while unit conversions run
// beside them. The
// CI runs this program under ThreadSanitizer, which fails it on any data
// race; tracing is off and handlers are installed before the threads start.
#include <gtest/gtest.h>

#include <atomic>
#include <cmath>
#include <cstring>
#include <latch>
#include <string>
#include <thread>
#include <vector>

#include "common/testutil.h"
#include "grd/test_harden_support.h"
#include "grd/fileio.h"
#include "qty/qty.h"
#include "qty/qty_tables.h"
#include "tova/grd.h"
#include "tova/trace.h"
#include "tova/vre.h"
#include "tova/xfs.h"

namespace {

constexpr int kThreads = 8;
constexpr int kRounds = 6;

std::atomic<int> g_notBlockReports{0};

int32_t TOVA_CALL countReport(HeaderHandle, FileHandle, int32_t, int32_t code, const char*, int32_t) {
    if (code == F_ERR_NOT_BLOCK) g_notBlockReports.fetch_add(1, std::memory_order_relaxed);
    return 0;
}

// Each scenario returns the first thing that went wrong, or an empty text.
using Result = std::string;

Result recordFile(const std::string& path, int seed) {
    FileHandle f = FOpenFileCreate(path.c_str(), 0);
    if (f == nullptr) return "record file: create";
    std::vector<int32_t> ints(200);
    for (size_t i = 0; i < ints.size(); ++i) ints[i] = seed * 1000 + static_cast<int32_t>(i);
    const double values[3] = {seed + 0.5, -1e-255, 3.0};
    rcfLrecWrite(f, RCF_INT4, static_cast<uint32_t>(ints.size()), ints.data());
    LrecNode* block = FCreateLogicalBlock(RCF_DOUBLE, 3, values);
    FAppendToLogicalBlock(RCF_BYTE, 5, "block", block);
    const int32_t written = grdCheckWriteLB(nullptr, static_cast<uint16_t>(seed), block, f, "test", __LINE__);
    FFreeLogicalBlock(block);
    if (written != 0 || FCloseFile(&f) != 0) return "record file: write";

    int32_t status = -1;
    f = FOpenFileRead(path.c_str(), &status);
    if (f == nullptr || status != 0) return "record file: open";
    Result result;
    // Not a block: reported through the handler table.
    if (FSkipLogicalBlock(f) != F_ERR_NOT_BLOCK) result = "record file: skip of a data record";
    rcfGetError(f);
    std::vector<int32_t> back(ints.size());
    if (rcfLrecRead(f, RCF_INT4, static_cast<uint32_t>(back.size()), back.data()) != back.size() || back != ints)
        result = "record file: records";
    LrecNode* read = FReadLogicalBlock(f);
    if (read == nullptr || read->type != RCF_DOUBLE || read->count != 3 ||
        std::memcmp(read->data, values, sizeof values) != 0 || read->next == nullptr ||
        std::memcmp(read->next->data, "block", 5) != 0)
        result = "record file: block";
    FFreeLogicalBlock(read);
    if (FCloseFile(&f) != 0) result = "record file: close";
    return result;
}

// A gridded data file with a static item, a compressed item, per-element
// statistics and a calendar axis, written and read back completely; what is
// read must be what a single thread read from the same file before.
Result gridFile(const std::string& path, const hardtest::Contents& expected) {
    const hardtest::Run written = hardtest::writeRichFile(path);
    if (!written.ok()) return "grd: write " + std::to_string(written.firstFailure);
    const hardtest::Contents read = hardtest::readEverything(path);
    if (!read.run.ok()) return "grd: read " + std::to_string(read.run.firstFailure);
    if (read.values != expected.values || read.times != expected.times || read.staticItems != expected.staticItems)
        return "grd: values";
    return {};
}

// A gridded file of one 2 MiB item with global statistics, whose extremes
// are scanned by the library's helper thread beside each record's write (or
// by the writer, when another thread's scan keeps the helper busy).
Result largeGridFile(const std::string& path, int seed) {
    HeaderHandle h = nullptr;
    if (grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "large", "tests", 1, 1, F_ITEM_STATS_GLOBAL, &h) != 0)
        return "large grd: header";
    ItemHandle item = grdItemD(h, 1);
    Result result;
    if (grdSetEqTimeAxis(h, 1400, 0.0, 60.0, 0) != 0 || grdSetItemInfo(h, item, QTY_ITEM_UNDEFINED, "big", 0, RCF_FLOAT) != 0 ||
        grdSetItemAxisEqD2(item, 0, 1024, 512, 0.0f, 0.0f, 1.0f, 1.0f) != 0)
        result = "large grd: items";
    FileHandle f = nullptr;
    if (result.empty() && grdFileCreate(path.c_str(), h, &f) != 0) result = "large grd: create";
    std::vector<float> values(1024 * 512);
    for (int s = 0; s < 2 && result.empty(); ++s) {
        for (size_t i = 0; i < values.size(); ++i) values[i] = static_cast<float>((i + s) % 1000) - seed;
        values[5] = F_DELETE_VALUE_FLOAT;
        if (grdWriteItemTimeStep(h, f, s, values.data()) != 0) result = "large grd: write";
    }
    double min = 0, max = 0;
    int32_t deletes = 0;
    if (result.empty() && (grdGetItemStatsGlobal(item, &min, &max, &deletes) != 0 || min != -seed ||
                           max != 999 - seed || deletes != 2))
        result = "large grd: statistics";
    if (f != nullptr && grdFileClose(h, &f) != 0 && result.empty()) result = "large grd: close";
    grdHeaderDestroy(&h);
    return result;
}

Result vreFile(const std::string& path, int seed) {
    VreHandle h = vreHandleCreate();
    if (h == nullptr) return "vre: create";
    vreSetVectorParam(h, 0, 2);
    vreSetVectorParam(h, 1, 2);
    vreSetVectorParam(h, 3, 3);
    const int32_t panels[2] = {seed + 1, 4};
    vreSetBodyPanelCount(h, panels);
    std::vector<double> item1(static_cast<size_t>(3 * (seed + 5)));
    for (size_t i = 0; i < item1.size(); ++i) item1[i] = seed + i * 0.25;
    vreSetVectorItem(h, 1, item1.data());
    vreSetScalarItem(h, 1, seed * 2.0);
    const int32_t written = vreFileWrite(path.c_str(), h);
    vreHandleFree(h);
    if (written != 0) return "vre: write";

    VreHandle back = nullptr;
    Result result;
    if (vreFileRead(path.c_str(), &back) != 0) result = "vre: read";
    std::vector<double> got(item1.size());
    if (vreGetVectorSize(back, 1) != static_cast<int32_t>(item1.size()) || vreGetVectorItem(back, 1, got.data()) != 0 ||
        got != item1 || vreGetScalarItem(back, 1) != seed * 2.0 || vreGetVectorParam(back, 2) != seed + 5)
        result = "vre: values";
    // A conversion by the unit library on the way out.
    vreSetScalarItemUnitConversion(back, 0, VRE_CONVERT_BASE, 0);
    if (std::isnan(vreGetScalarItem(back, 0))) result = "vre: conversion";
    vreHandleFree(back);
    return result;
}

Result xfsFile(const std::string& path, int seed) {
    FileHandle f = nullptr;
    if (xfsFileOpenCreate(path.c_str(), &f) != 0) return "xfs: create";
    for (int i = 0; i < 5; ++i) {
        XsecHandle x = xfsXsecCreate("river", seed * 10 + i, "reach");
        if (x == nullptr || xfsXsecSetNoCoords(x, 4) != 1) return "xfs: cross section";
        for (int k = 0; k < 4; ++k) x->coords[0][k] = seed + i + k;
        xfsXsecWrite(x, f);
        xfsXsecFree(&x);
    }
    if (xfsFileClose(&f) != 0) return "xfs: close";

    XsecTableHandle table = nullptr;
    if (xfsXsecTableLoad(path.c_str(), &table, 0) != 0) return "xfs: load";
    Result result;
    XsecCursor cursor = nullptr;
    XsecHandle x = xfsXsecFind(table, "RIVER", seed * 10 + 2, "Reach", &cursor);
    if (x == nullptr || x->coords[0][3] != seed + 2 + 3) result = "xfs: find";
    int walked = 0;
    for (XsecHandle w = xfsXsecFind(table, "", 0.0, "", &cursor); w != nullptr; w = xfsXsecFindNext(table, cursor))
        ++walked;
    if (walked != 5) result = "xfs: walk";
    xfsXsecTableFree(&table);
    return result;
}

Result conversions(int seed) {
    std::vector<double> values(1000);
    for (size_t i = 0; i < values.size(); ++i) values[i] = seed + static_cast<double>(i);
    values[7] = -1e-35;
    if (!qtyConvertItemArrayD(qty::kFoot, qty::kMetre, values.data(), static_cast<int32_t>(values.size()), -1e-35))
        return "qty: array";
    if (values[7] != -1e-35 || std::fabs(values[1] - (seed + 1.0) * 0.3048) > 1e-12) return "qty: array values";
    double out = 0;
    if (!qtyConvertUnit(qty::kInch, 2, qty::kMillimetre, &out) || out != 50.8) return "qty: value";
    return {};
}

}  // namespace

TEST(Threads, DistinctFilesOnEightThreadsAtOnce) {
    grdDebugOn(0);
    DebugFileIO(0);
    grdAddErrorHandler(F_ERR_NOT_BLOCK, countReport);
    g_notBlockReports = 0;
    testutil::TempDir dir;
    // The gridded file as one thread reads it.
    ASSERT_TRUE(hardtest::writeRichFile(dir.file("reference.grd")).ok());
    const hardtest::Contents reference = hardtest::readEverything(dir.file("reference.grd"));
    ASSERT_TRUE(reference.run.ok());
    ASSERT_EQ(reference.stepsRead, hardtest::kRichSteps);
    std::vector<Result> failures(kThreads);
    std::latch start(kThreads);
    std::vector<std::thread> threads;
    for (int t = 0; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            start.arrive_and_wait();
            const std::string base = dir.file("t" + std::to_string(t));
            for (int round = 0; round < kRounds && failures[t].empty(); ++round) {
                for (Result r : {recordFile(base + ".rcf", t), gridFile(base + ".grd", reference),
                                 largeGridFile(base + "-large.grd", t),
                                 vreFile(base + ".vre", t), xfsFile(base + ".xfs", t), conversions(t)}) {
                    if (failures[t].empty() && !r.empty()) failures[t] = r + " (round " + std::to_string(round) + ")";
                }
            }
        });
    }
    for (auto& thread : threads) thread.join();
    grdAddErrorHandler(F_ERR_NOT_BLOCK, nullptr);
    EXPECT_EQ(failures, std::vector<Result>(kThreads));
    EXPECT_EQ(g_notBlockReports.load(), kThreads * kRounds);
}

// A user unit may change while other threads convert: each conversion sees
// either the old or the new unit, never a torn state.
TEST(Threads, UnitConversionsWhileAUserUnitChanges) {
    int32_t level = 0;
    ASSERT_TRUE(qtyGetItemTypeTag("WaterLevel", &level));
    int32_t original = 0;
    ASSERT_TRUE(qtyGetUserUnit(level, &original));
    std::atomic<bool> stop{false};
    std::vector<int> bad(kThreads, 0);
    std::vector<std::thread> threads;
    threads.emplace_back([&] {
        for (int i = 0; i < 2000; ++i) qtySetUserUnit(level, i % 2 == 0 ? qty::kFoot : qty::kMetre);
        stop = true;
    });
    for (int t = 1; t < kThreads; ++t) {
        threads.emplace_back([&, t] {
            while (!stop) {
                double out = 0;
                if (!qtyConvertToUserUnit(level, qty::kMetre, 0.3048, &out) ||
                    (out != 0.3048 && std::fabs(out - 1.0) > 1e-15))
                    ++bad[t];
            }
        });
    }
    for (auto& thread : threads) thread.join();
    qtySetUserUnit(level, original);
    EXPECT_EQ(bad, std::vector<int>(kThreads, 0));
}
