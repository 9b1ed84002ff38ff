// Tests of extension plug-ins through real libraries: loading by the data
// type, refusals, the items a plug-in offers, reads, skips and positioning
// routed through it, unloading. The test plug-ins (tests/grd/plugins) record
// the calls they get; grdExt_901 offers the file's two items and one derived
// item {2 x first value of item 1, time}.
#include "test_plugin_support.h"

namespace grdtest {
namespace {

class RecorderTest : public PluginTest {
protected:
    // A data file of the given data type: item 1 float on an EqD1 axis of
    // three elements ({t, t + 0.5, t + 1} at time step t), item 2 one float
    // (100 + t); an equidistant time axis. Left open for reading.
    void writeAndOpen(int32_t dataType, int32_t steps) {
        path_ = dir_.file("recorder.grd");
        makeFileHeader(2);
        ASSERT_EQ(grdSetDataType(header_, dataType), 0);
        ASSERT_EQ(grdSetItemAxisEqD1(grdItemD(header_, 1), 20100, 3, 0.0f, 1.0f), 0);
        create(path_);
        for (int32_t t = 0; t < steps; ++t) {
            const float a[3] = {float(t), t + 0.5f, t + 1.0f};
            const float b[1] = {100.0f + t};
            ASSERT_EQ(grdWriteItemTimeStep(header_, file_, t, a), 0);
            ASSERT_EQ(grdWriteItemTimeStep(header_, file_, t, b), 0);
        }
        close();
        open(path_);
    }

    void enable(int32_t dataType) {
        ASSERT_EQ(grdSetDataType(header_, dataType), 0);
        ASSERT_EQ(grdEnablePlugin(header_, file_), 0);
    }

    // Reads the three items of the time step under the cursor and checks
    // them against time step t.
    void expectTimeStep(int32_t t) {
        std::vector<float> v;
        double time = -1.0;
        ASSERT_EQ(read(v, &time), 0);
        EXPECT_EQ(time, t);
        EXPECT_EQ(v, (std::vector<float>{float(t), t + 0.5f, t + 1.0f}));
        ASSERT_EQ(read(v, &time), 0);
        EXPECT_EQ(v, std::vector<float>{100.0f + t});
        ASSERT_EQ(read(v, &time), 0);
        EXPECT_EQ(v, (std::vector<float>{2.0f * t, float(t)}));
        EXPECT_EQ(time, t);
    }

    std::string path_;
};

TEST_F(RecorderTest, LoadsTheLibraryOfTheDataTypesAbsoluteValue) {
    writeAndOpen(-901, 1);
    PluginProbe probe(901);
    EXPECT_EQ(grdEnablePlugin(header_, file_), 0);
    EXPECT_EQ(probe.log(), "I");
    EXPECT_EQ(grdGetNoOfItems(header_), 3);
    EXPECT_EQ(grdGetDataType(header_), -901);
    // One plug-in at a time.
    EXPECT_EQ(grdEnablePlugin(header_, file_), -1);
    EXPECT_EQ(probe.log(), "I");
    EXPECT_TRUE(reports().empty());
}

TEST_F(RecorderTest, RefusalsAreReturnedNotReported) {
    writeAndOpen(0, 2);
    EXPECT_EQ(grdEnablePlugin(header_, file_), -2);  // data type 0
    ASSERT_EQ(grdSetDataType(header_, 999), 0);
    EXPECT_EQ(grdEnablePlugin(header_, file_), -3);  // no such library
    ASSERT_EQ(grdSetDataType(header_, 901), 0);
    EXPECT_EQ(grdEnablePlugin(header_, nullptr), -1);
    ASSERT_EQ(grdSkipItem(header_, file_), 0);
    EXPECT_EQ(grdEnablePlugin(header_, file_), -1);  // inside a time step
    EXPECT_TRUE(reports().empty());
    EXPECT_FALSE(pluginLoaded(901));
    EXPECT_EQ(grdGetNoOfItems(header_), 2);
    // From the next time step on it can take over.
    ASSERT_EQ(grdSkipItem(header_, file_), 0);
    ASSERT_EQ(grdEnablePlugin(header_, file_), 0);
    expectTimeStep(1);

    // A file open for editing is refused before anything is loaded.
    ASSERT_EQ(grdFileClose(header_, &file_), 0);
    grdHeaderDestroy(&header_);
    ASSERT_EQ(grdFileEdit(path_.c_str(), &header_, &file_), 0);
    ASSERT_EQ(grdSetDataType(header_, 901), 0);
    EXPECT_EQ(grdEnablePlugin(header_, file_), -1);
    EXPECT_FALSE(pluginLoaded(901));
    EXPECT_TRUE(reports().empty());

    EXPECT_EQ(grdEnablePlugin(nullptr, file_), 1000);
    EXPECT_EQ(takeCodes(), Codes{1000});
}

TEST_F(RecorderTest, RefusedPluginLeavesTheHeaderUnchanged) {
    writeAndOpen(0, 1);
    const ItemHandle first = grdItemD(header_, 1);
    const auto unchanged = [&] {
        EXPECT_EQ(grdGetNoOfItems(header_), 2);
        EXPECT_EQ(grdItemD(header_, 1), first);
        const char* name = nullptr;
        EXPECT_EQ(grdGetItemInfo_(grdItemD(header_, 2), nullptr, &name, nullptr, nullptr), 0);
        EXPECT_STREQ(name, "item 2");
        EXPECT_EQ(grdGetItemAxisType(first), F_EQ_AXIS_D1);
    };

    // Without grdExtNewTimeStep: refused before it is initialised.
    ASSERT_EQ(grdSetDataType(header_, 902), 0);
    {
        PluginProbe probe(902);
        EXPECT_EQ(grdEnablePlugin(header_, file_), -1);
        EXPECT_EQ(probe.log(), "");
    }
    EXPECT_FALSE(pluginLoaded(902));
    unchanged();

    // An initialisation that fails is not terminated.
    ASSERT_EQ(grdSetDataType(header_, 904), 0);
    {
        PluginProbe probe(904);
        EXPECT_EQ(grdEnablePlugin(header_, file_), -1);
        EXPECT_EQ(probe.log(), "I");
    }
    unchanged();

    // An axis type out of range, after a successful initialisation: the
    // plug-in is terminated again.
    ASSERT_EQ(grdSetDataType(header_, 903), 0);
    {
        PluginProbe probe(903);
        EXPECT_EQ(grdEnablePlugin(header_, file_), -1);
        EXPECT_EQ(probe.log(), "IT");
    }
    EXPECT_FALSE(pluginLoaded(903));
    unchanged();
    EXPECT_TRUE(reports().empty());

    // The header still reads its own items.
    std::vector<float> v;
    ASSERT_EQ(read(v), 0);
    EXPECT_EQ(v, (std::vector<float>{0.0f, 0.5f, 1.0f}));
}

TEST_F(RecorderTest, MemoryFailureWhileEnablingLeavesTheHeaderUnchanged) {
    writeAndOpen(901, 1);
    PluginProbe probe(901);
    int32_t status = F_ERR_MEMORY;
    int32_t nth = 1;
    for (; status == F_ERR_MEMORY && nth < 100; ++nth) {
        probe.clear();
        grdTestFailAllocation(nth);
        status = grdEnablePlugin(header_, file_);
        grdTestFailAllocation(0);
        if (status != F_ERR_MEMORY) break;
        EXPECT_EQ(takeCodes(), Codes{F_ERR_MEMORY}) << nth;
        EXPECT_EQ(grdGetNoOfItems(header_), 2);
        EXPECT_EQ(header_->extension.data, nullptr);
        const std::string log = probe.log();
        EXPECT_TRUE(log.empty() || log == "IT") << nth << ": " << log;  // terminated once initialised
    }
    EXPECT_GT(nth, 3);  // several allocations could fail
    ASSERT_EQ(status, 0);
    expectTimeStep(0);
}

TEST_F(RecorderTest, OffersCopiesOfTheFileItemsAndTheDescribedDerivedItem) {
    writeAndOpen(901, 1);
    enable(901);
    ASSERT_EQ(grdGetNoOfItems(header_), 3);

    // The copies: as in the file.
    int32_t type = 0, dataType = 0, unit = -1, size = 0;
    const char* name = nullptr;
    const char* unitText = nullptr;
    float x0 = -1.0f, dx = -1.0f;
    ASSERT_EQ(grdGetItemInfo_(grdItemD(header_, 1), &type, &name, nullptr, &dataType), 0);
    EXPECT_STREQ(name, "item 1");
    EXPECT_EQ(type, QTY_ITEM_UNDEFINED);
    EXPECT_EQ(dataType, RCF_FLOAT);
    ASSERT_EQ(grdGetItemAxisEqD1(grdItemD(header_, 1), &unit, nullptr, &size, &x0, &dx), 0);
    EXPECT_EQ(unit, 20100);
    EXPECT_EQ(size, 3);
    EXPECT_EQ(grdGetItemAxisType(grdItemD(header_, 2)), F_EQ_AXIS_D0);

    // The derived item: as the plug-in describes it.
    const ItemHandle derived = grdItemD(header_, 3);
    ASSERT_EQ(grdGetItemInfo_(derived, &type, &name, &unitText, &dataType), 0);
    EXPECT_EQ(type, 999);
    EXPECT_STREQ(name, "Derived");
    EXPECT_STREQ(unitText, "units");
    EXPECT_EQ(dataType, RCF_FLOAT);
    ASSERT_EQ(grdGetItemAxisEqD1(derived, &unit, nullptr, &size, &x0, &dx), 0);
    EXPECT_EQ(unit, 20100);
    EXPECT_EQ(size, 2);
    EXPECT_EQ(x0, 10.0f);
    EXPECT_EQ(dx, 0.5f);
    EXPECT_EQ(grdGetItemElements(derived), 2);
    int32_t valueType = -1;
    ASSERT_EQ(grdGetItemValueType(derived, &valueType), 0);
    EXPECT_EQ(valueType, 2);
    double minimum = 0.0, maximum = 0.0;
    int32_t deletes = 0;
    ASSERT_EQ(grdGetItemStatsGlobal(derived, &minimum, &maximum, &deletes), 0);
    EXPECT_EQ(minimum, -1.5);
    EXPECT_EQ(maximum, 7.25);
    EXPECT_EQ(deletes, 3);
    EXPECT_EQ(header_->noOfFileItems, 2);
}

TEST_F(RecorderTest, ReadsEveryItemThroughThePlugin) {
    writeAndOpen(901, 3);
    enable(901);
    PluginProbe probe(901);
    for (int32_t t = 0; t < 3; ++t) expectTimeStep(t);
    // While preparing a time step the plug-in saw the file's two items and
    // read them itself; each item was delivered by it.
    EXPECT_EQ(probe.log(), "N2R1R2R3N2R1R2R3N2R1R2R3");
    EXPECT_EQ(cursor(), std::make_pair(1, 3));
    EXPECT_TRUE(reports().empty());

    // Past the end: the plug-in's read of the file fails; its status comes
    // back and the cursor stays.
    probe.clear();
    std::vector<float> v;
    EXPECT_NE(read(v), 0);
    EXPECT_EQ(probe.log().substr(0, 3), "N2E");
    EXPECT_EQ(cursor(), std::make_pair(1, 3));
}

TEST_F(RecorderTest, SkipsLetThePluginPrepareTheTimeStepOnly) {
    writeAndOpen(901, 3);
    enable(901);
    PluginProbe probe(901);
    ASSERT_EQ(grdSkipItem(header_, file_), 0);
    std::vector<float> v;
    double time = -1.0;
    ASSERT_EQ(read(v, &time), 0);
    EXPECT_EQ(v, std::vector<float>{100.0f});
    ASSERT_EQ(grdReadItemTimeStep(header_, file_, &time, nullptr), 0);  // no buffer
    EXPECT_EQ(probe.log(), "N2R2S3");

    probe.clear();
    ASSERT_EQ(grdSkipTimeStep(header_, file_), 0);
    EXPECT_EQ(probe.log(), "N2");
    EXPECT_EQ(cursor(), std::make_pair(1, 2));
    expectTimeStep(2);
}

TEST_F(RecorderTest, PositioningWhileLoaded) {
    writeAndOpen(901, 9);
    enable(901);
    ASSERT_EQ(grdFindTimeStep(header_, file_, 7), 0);  // far ahead: a measured jump
    expectTimeStep(7);
    ASSERT_EQ(grdFindItemDynamic(header_, file_, 2, 3), 0);  // back, to the derived item
    EXPECT_EQ(cursor(), std::make_pair(3, 2));
    std::vector<float> v;
    ASSERT_EQ(read(v), 0);
    EXPECT_EQ(v, (std::vector<float>{4.0f, 2.0f}));
    ASSERT_EQ(grdFindTimeStep(header_, file_, 3), 0);
    expectTimeStep(3);
    expectTimeStep(4);
    EXPECT_TRUE(reports().empty());
}

TEST_F(RecorderTest, UnloadTerminatesAndKeepsThePluginsItems) {
    writeAndOpen(901, 1);
    {
        PluginProbe probe(901);
        enable(901);
        EXPECT_EQ(grdUnloadPlugin(header_), 5);  // what grdExtTerminate returned
        EXPECT_EQ(probe.log(), "IT");
        EXPECT_EQ(grdUnloadPlugin(header_), 0);  // nothing loaded
        EXPECT_EQ(probe.log(), "IT");
    }
    EXPECT_FALSE(pluginLoaded(901));
    EXPECT_EQ(grdGetNoOfItems(header_), 3);
    const char* name = nullptr;
    ASSERT_EQ(grdGetItemInfo_(grdItemD(header_, 3), nullptr, &name, nullptr, nullptr), 0);
    EXPECT_STREQ(name, "Derived");
    EXPECT_EQ(grdUnloadPlugin(nullptr), 1000);
    EXPECT_EQ(takeCodes(), Codes{1000});
    // It can be loaded again.
    EXPECT_EQ(grdEnablePlugin(header_, file_), 0);
}

TEST_F(RecorderTest, DestroyingTheHeaderUnloadsThePlugin) {
    writeAndOpen(901, 2);
    {
        PluginProbe probe(901);
        enable(901);
        expectTimeStep(0);
        grdHeaderDestroy(&header_);
        EXPECT_EQ(probe.log(), "IN2R1R2R3T");
    }
    EXPECT_FALSE(pluginLoaded(901));

    // Without a probe: the library goes with the header.
    open(path_);
    enable(901);
    EXPECT_TRUE(pluginLoaded(901));
    grdHeaderDestroy(&header_);
    EXPECT_FALSE(pluginLoaded(901));
}

TEST_F(RecorderTest, CursorQuery) {
    writeAndOpen(0, 2);
    EXPECT_EQ(cursor(), std::make_pair(1, 0));
    ASSERT_EQ(grdSkipItem(header_, file_), 0);
    EXPECT_EQ(cursor(), std::make_pair(2, 0));
    ASSERT_EQ(grdSkipItem(header_, file_), 0);
    EXPECT_EQ(cursor(), std::make_pair(1, 1));
    EXPECT_EQ(grdGetItemCursor(header_, nullptr, nullptr), 0);
    EXPECT_EQ(grdGetItemCursor(nullptr, nullptr, nullptr), 1000);
}

}  // namespace
}  // namespace grdtest
