// Test support for the header-model tests: a handler that records every
// report, a fixture that installs it for every status code and owns a header,
// and look-ups of units in the real unit library.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <string>
#include <vector>

#include "grd/grdheader.h"
#include "qty/qty.h"
#include "tova/grd.h"

namespace grdtest {

struct Report {
    HeaderHandle header;
    FileHandle file;
    int32_t code;
    std::string module;
};

inline std::vector<Report>& reports() {
    static std::vector<Report> all;
    return all;
}

inline int32_t TOVA_CALL recordReport(HeaderHandle header, FileHandle file, int32_t /*extra*/, int32_t code,
                                      const char* module, int32_t /*line*/) {
    reports().push_back({header, file, code, module ? module : ""});
    return 0;
}

// Installs the recording handler for every code that can carry one and
// clears the record; the header (if any) is destroyed at the end.
class GrdTest : public testing::Test {
protected:
    void SetUp() override {
        grdInitSystem();
        grdAddErrorHandler(1000, recordReport);
        for (int32_t code = 2000; code <= 2019; ++code) grdAddErrorHandler(code, recordReport);
        reports().clear();
    }
    void TearDown() override {
        grdTestFailAllocation(0);
        if (header_ != nullptr) grdHeaderDestroy(&header_);
        grdInitSystem();
    }

    // A header of the given file type with n items, statistics type stats.
    HeaderHandle makeHeader(int32_t fileType = F_EQTIME_FIXEDSPACE_ALLITEMS, int32_t n = 2, int32_t stats = 1) {
        if (header_ != nullptr) grdHeaderDestroy(&header_);
        EXPECT_EQ(grdHeaderCreate(fileType, "file", "app", 3, n, stats, &header_), 0);
        return header_;
    }
    // Item itemNo of the fixture's header with info set (geometry 0-D type
    // and its first unit, float data).
    ItemHandle makeItem(int32_t itemNo = 1, int32_t dataType = 1) {
        ItemHandle item = grdItemD(header_, itemNo);
        EXPECT_EQ(grdSetItemInfo(header_, item, QTY_ITEM_UNDEFINED, "item", 0, dataType), 0);
        return item;
    }

    // Codes reported since the last call, in order.
    static std::vector<int32_t> takeCodes() {
        std::vector<int32_t> codes;
        for (const Report& r : reports()) codes.push_back(r.code);
        reports().clear();
        return codes;
    }

    HeaderHandle header_ = nullptr;
};

using Codes = std::vector<int32_t>;

// The sequenceNo-th unit of a quantity type (0 when there is none).
inline int32_t unitOf(int32_t itemType, int32_t sequenceNo) {
    int32_t unit = 0;
    const char* text = nullptr;
    return qtyGetItemUnitSeq(itemType, sequenceNo, &unit, &text) ? unit : 0;
}

// A unit that converts to factor seconds (0 when the library has none).
inline int32_t unitOfSeconds(double factor) {
    const int32_t n = qtyGetUnitCount();
    for (int32_t i = 0; i < n; ++i) {
        int32_t unit = 0;
        const char* text = nullptr;
        const char* description = nullptr;
        double seconds = 0.0;
        if (qtyGetUnitByIndex(i, &unit, &text, &description) && unit != QTY_UNIT_SECOND &&
            qtyConvertUnit(unit, 1.0, QTY_UNIT_SECOND, &seconds) && seconds == factor)
            return unit;
    }
    return 0;
}

// value converted between two units by the unit library.
inline double convert(int32_t from, double value, int32_t to) {
    double out = value;
    EXPECT_NE(qtyConvertUnit(from, value, to, &out), 0) << from << " -> " << to;
    return out;
}

}  // namespace grdtest
