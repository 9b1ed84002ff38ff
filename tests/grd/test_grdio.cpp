// Error-handler table and status dispatcher.
#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "grd/grdio.h"
#include "tova/grd.h"

namespace {

struct Call {
    HeaderHandle header;
    FileHandle file;
    int32_t extra, code;
    std::string module;
    int32_t line;
};
std::vector<Call> g_calls;

int32_t TOVA_CALL recordingHandler(HeaderHandle h, FileHandle f, int32_t extra, int32_t code, const char* module,
                                   int32_t line) {
    g_calls.push_back({h, f, extra, code, module, line});
    return 0;
}

class Handlers : public testing::Test {
protected:
    void SetUp() override {
        grdInitSystem();
        g_calls.clear();
    }
    void TearDown() override { grdInitSystem(); }
};

}  // namespace

TEST_F(Handlers, DispatcherCallsTheSlotOfTheCodeWithTheContext) {
    EXPECT_EQ(grdAddErrorHandler(2003, recordingHandler), reinterpret_cast<intptr_t>(&recordingHandler));
    auto* header = reinterpret_cast<HeaderHandle>(0x10);
    auto* file = reinterpret_cast<FileHandle>(0x20);
    EXPECT_EQ(grdReportError(header, file, 7, 2003, "..\\grd\\grdopen", 42), 2003);
    ASSERT_EQ(g_calls.size(), 1u);
    EXPECT_EQ(g_calls[0].header, header);
    EXPECT_EQ(g_calls[0].file, file);
    EXPECT_EQ(g_calls[0].extra, 7);
    EXPECT_EQ(g_calls[0].code, 2003);
    EXPECT_EQ(g_calls[0].module, "..\\grd\\grdopen");
    EXPECT_EQ(g_calls[0].line, 42);
    // Other codes do not reach that handler.
    EXPECT_EQ(grdReportError(nullptr, nullptr, 0, 2004, "m", 1), 2004);
    EXPECT_EQ(g_calls.size(), 1u);
}

TEST_F(Handlers, SlotMappingCoversArgumentAndIoCodes) {
    EXPECT_EQ(grdHandlerSlot(1000), 0);
    EXPECT_EQ(grdHandlerSlot(2000), 1);
    EXPECT_EQ(grdHandlerSlot(2001), 2);
    EXPECT_EQ(grdHandlerSlot(2019), 20);
    EXPECT_EQ(grdHandlerSlot(2020), 21);
    EXPECT_EQ(grdHandlerSlot(2021), -1);
    EXPECT_EQ(grdHandlerSlot(1001), -1);
    EXPECT_EQ(grdHandlerSlot(-1), -1);
    for (int32_t code : {1000, 2000, 2001, 2010, 2019}) {
        grdAddErrorHandler(code, recordingHandler);
        grdReportError(nullptr, nullptr, 0, code, "m", 1);
    }
    EXPECT_EQ(g_calls.size(), 5u);
}

TEST_F(Handlers, CodesOutsideTheTableAreReturnedWithoutCallingAnything) {
    for (int32_t code : {1000, 2000, 2001, 2002, 2019}) grdAddErrorHandler(code, recordingHandler);
    EXPECT_EQ(grdReportError(nullptr, nullptr, 0, 2021, "m", 1), 2021);
    EXPECT_EQ(grdReportError(nullptr, nullptr, 0, -1, "m", 1), -1);
    EXPECT_EQ(grdReportError(nullptr, nullptr, 0, 1, "m", 1), 1);
    EXPECT_EQ(grdReportError(nullptr, nullptr, 0, 1001, "m", 1), 1001);
    EXPECT_TRUE(g_calls.empty());
}

TEST_F(Handlers, Code2020CannotBeSetAndUnknownCodesStoreNothing) {
    EXPECT_EQ(grdAddErrorHandler(2020, recordingHandler), 19);
    EXPECT_EQ(grdReportError(nullptr, nullptr, 0, 2020, "m", 1), 2020);
    EXPECT_TRUE(g_calls.empty());
    EXPECT_EQ(grdAddErrorHandler(999, recordingHandler), 999);
    EXPECT_EQ(grdAddErrorHandler(2025, recordingHandler), 24);
    EXPECT_EQ(grdAddErrorHandler(-5, recordingHandler), -5);
}

TEST_F(Handlers, NullHandlerClearsItsSlot) {
    grdAddErrorHandler(2006, recordingHandler);
    EXPECT_EQ(grdAddErrorHandler(2006, nullptr), 0);
    grdReportError(nullptr, nullptr, 0, 2006, "m", 1);
    EXPECT_TRUE(g_calls.empty());
}

TEST_F(Handlers, CommonHandlerClearsEverySlotAndIsNeverCalled) {
    for (int32_t code : {1000, 2000, 2001, 2009, 2019}) grdAddErrorHandler(code, recordingHandler);
    EXPECT_NE(grdAddCommonErrorHandler(recordingHandler), 0);
    for (int32_t code : {1000, 2000, 2001, 2009, 2019, 2020}) grdReportError(nullptr, nullptr, 0, code, "m", 1);
    EXPECT_TRUE(g_calls.empty());
}

TEST_F(Handlers, DebugOnStoresFlagAsGiven) {
    EXPECT_EQ(grdDebugOn(7), 7);
    EXPECT_EQ(grdDebugOn(0), 0);
}

TEST(StatusText, EveryCodeHasItsNameAndUnknownCodesSaySo) {
    EXPECT_STREQ(grdGetStatusText(F_ERR_OPEN), "F_ERR_OPEN: the file could not be opened");
    EXPECT_STREQ(grdGetStatusText(0), "F_NO_ERROR: success");
    for (int32_t code : {1, 1000, 1001, 1002}) EXPECT_STREQ(std::string(grdGetStatusText(code)).substr(0, 2).c_str(), "F_");
    for (int32_t code = 2000; code <= 2020; ++code) EXPECT_EQ(std::string(grdGetStatusText(code)).rfind("F_ERR_", 0), 0u) << code;
    EXPECT_STREQ(grdGetStatusText(2021), "unknown status");
    EXPECT_STREQ(grdGetStatusText(-1), "unknown status");
}
