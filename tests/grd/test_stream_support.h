// Test support for the header-stream tests: writing a header into a real
// record file and reading it back, a field-by-field comparison of two
// headers, hand-built streams, the block tags of a file, and a rewrite of a
// file into the opposite byte order.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <initializer_list>
#include <memory>
#include <string>
#include <vector>

#include "common/testutil.h"
#include "grd/fileio.h"
#include "grd/grdheader.h"
#include "grd/grdstream.h"
#include "test_header_support.h"

namespace streamtest {

struct HeaderDelete {
    void operator()(GrdHeader* h) const {
        if (h != nullptr) grdHeaderDestroy(&h);
    }
};
using HeaderPtr = std::unique_ptr<GrdHeader, HeaderDelete>;

// The file object's own deleter, for files opened by a test.
struct FileClose {
    void operator()(RcfFile* f) const {
        if (f != nullptr) FCloseFile(&f);
    }
};
using FilePtr = std::unique_ptr<RcfFile, FileClose>;

// Writes header into a new file at the create position (appBase), then an
// empty 50000 block so that a reader stops. Returns grdWriteHeader's status.
inline int32_t writeHeaderFile(const std::string& path, HeaderHandle header) {
    FileHandle file = FOpenFileCreate(path.c_str(), 0);
    EXPECT_NE(file, nullptr);
    if (file == nullptr) return -1;
    rcfSeekAppBase(file);
    const int32_t status = grdWriteHeader(header, file);
    rcfBlockWrite(kTagDynamicStart, file, nullptr);
    EXPECT_EQ(FCloseFile(&file), 0);
    return status;
}

// Reads the header stream of the file at path; null with *status on failure.
inline HeaderPtr readHeaderFile(const std::string& path, int32_t* status) {
    int32_t openStatus = 0;
    FilePtr file(FOpenFileRead(path.c_str(), &openStatus));
    EXPECT_EQ(openStatus, 0);
    if (!file) return nullptr;
    return HeaderPtr(grdReadHeader(file.get(), status));
}

// The tags of the blocks that follow appBase, in file order.
inline std::vector<int32_t> blockTags(const std::string& path) {
    int32_t status = 0;
    FilePtr file(FOpenFileRead(path.c_str(), &status));
    std::vector<int32_t> tags;
    if (!file) return tags;
    for (;;) {
        uint32_t tag = 0;
        if (rcfQuery(file.get(), &tag) != RCF_BLOCK) break;
        tags.push_back(static_cast<int32_t>(tag));
        if (rcfBlockSkip(file.get()) != 0) break;
    }
    return tags;
}

// Number of coordinate values of array d of an axis.
inline int64_t coordCount(const GrdItem& it, int d) {
    switch (it.axisType) {
        case F_NEQ_AXIS_D1:
        case F_NEQ_AXIS_D2:
        case F_NEQ_AXIS_D3:
            return int64_t{it.size[d]} + 1;
        case F_CURVE_LINEAR_AXIS_D2:
            return (int64_t{it.size[0]} + 1) * (it.size[1] + 1);
        case F_CURVE_LINEAR_AXIS_D3:
            return (int64_t{it.size[0]} + 1) * (it.size[1] + 1) * (it.size[2] + 1);
        default:
            return 0;
    }
}

inline bool sameBits(const void* a, const void* b, size_t bytes) {
    if (bytes == 0) return true;
    if (a == nullptr || b == nullptr) return a == b;
    return std::memcmp(a, b, bytes) == 0;
}

inline void expectSameItem(const GrdItem& a, const GrdItem& b, int itemNo) {
    SCOPED_TRACE("item " + std::to_string(itemNo));
    EXPECT_STREQ(a.name.orEmpty(), b.name.orEmpty());
    EXPECT_EQ(a.itemType, b.itemType);
    EXPECT_STREQ(a.unitText.orEmpty(), b.unitText.orEmpty());
    EXPECT_EQ(a.unit, b.unit);
    EXPECT_EQ(a.dataType, b.dataType);
    EXPECT_EQ(a.globalMax, b.globalMax);
    EXPECT_EQ(a.globalMin, b.globalMin);
    EXPECT_EQ(a.globalDeletes, b.globalDeletes);
    EXPECT_EQ(a.axisType, b.axisType);
    EXPECT_EQ(a.axisUnit, b.axisUnit);
    for (int d = 0; d < 4; ++d) {
        EXPECT_EQ(a.size[d], b.size[d]) << "size " << d;
        EXPECT_EQ(a.origin[d], b.origin[d]) << "origin " << d;
        EXPECT_EQ(a.step[d], b.step[d]) << "step " << d;
    }
    for (int d = 0; d < 3; ++d) {
        const int64_t n = coordCount(a, d);
        if (n == 0 || (a.axisType <= F_NEQ_AXIS_D1 && d > 0) || (a.axisType <= F_NEQ_AXIS_D2 && d > 1)) continue;
        EXPECT_TRUE(sameBits(a.coords[d].get(), b.coords[d].get(), static_cast<size_t>(n) * sizeof(double)))
            << "coordinates " << d;
    }
    EXPECT_EQ(a.valueType, b.valueType);
    EXPECT_EQ(a.refX, b.refX);
    EXPECT_EQ(a.refY, b.refY);
    EXPECT_EQ(a.refZ, b.refZ);
    EXPECT_EQ(a.alpha, b.alpha);
    EXPECT_EQ(a.phi, b.phi);
    EXPECT_EQ(a.theta, b.theta);
    EXPECT_EQ(a.elemStatsCount, b.elemStatsCount);
    EXPECT_EQ(a.elemStats == nullptr, b.elemStats == nullptr);
    EXPECT_TRUE(sameBits(a.elemStats.get(), b.elemStats.get(),
                         static_cast<size_t>(a.elemStatsCount) * sizeof(GrdElementStats)));
    EXPECT_EQ(a.assocStatic, b.assocStatic);
}

// Every field that the stream stores, compared field by field.
inline void expectSameHeader(const GrdHeader& a, const GrdHeader& b) {
    EXPECT_EQ(a.fileType, b.fileType);
    EXPECT_STREQ(a.fileTitle.orEmpty(), b.fileTitle.orEmpty());
    EXPECT_STREQ(a.appTitle.orEmpty(), b.appTitle.orEmpty());
    EXPECT_EQ(a.appVersionNo, b.appVersionNo);
    EXPECT_EQ(a.dataType, b.dataType);
    EXPECT_EQ(a.fileCompressed, b.fileCompressed);
    EXPECT_EQ(a.statsType, b.statsType);
    EXPECT_TRUE(sameBits(&a.deleteValFloat, &b.deleteValFloat, sizeof(float)));
    EXPECT_TRUE(sameBits(&a.deleteValDouble, &b.deleteValDouble, sizeof(double)));
    EXPECT_EQ(a.deleteValByte, b.deleteValByte);
    EXPECT_EQ(a.deleteValInt, b.deleteValInt);
    EXPECT_EQ(a.deleteValUnsignedInt, b.deleteValUnsignedInt);
    EXPECT_EQ(a.geoInfoType, b.geoInfoType);
    EXPECT_STREQ(a.projection.orEmpty(), b.projection.orEmpty());
    EXPECT_EQ(a.longitude, b.longitude);
    EXPECT_EQ(a.latitude, b.latitude);
    EXPECT_EQ(a.orientation, b.orientation);

    const GrdTimeAxis& ta = a.timeAxis;
    const GrdTimeAxis& tb = b.timeAxis;
    EXPECT_EQ(ta.type, tb.type);
    const bool calendar = ta.type == F_CAL_EQ_AXIS || ta.type == F_CAL_NEQ_AXIS;
    const GrdTimeValues& va = calendar ? ta.calendar : ta.time;
    const GrdTimeValues& vb = calendar ? tb.calendar : tb.time;
    EXPECT_EQ(va.unit, vb.unit);
    EXPECT_STREQ(va.unitText.orEmpty(), vb.unitText.orEmpty());
    EXPECT_EQ(va.start, vb.start);
    EXPECT_EQ(va.step, vb.step);
    EXPECT_EQ(va.timeSteps, vb.timeSteps);
    EXPECT_EQ(va.firstIndex, vb.firstIndex);
    if (calendar) {
        EXPECT_STREQ(ta.startDate, tb.startDate);
        EXPECT_STREQ(ta.startTime, tb.startTime);
    }

    ASSERT_EQ(a.noOfItems, b.noOfItems);
    for (int32_t n = 0; n < a.noOfItems; ++n) {
        expectSameItem(a.items[n], b.items[n], n + 1);
        EXPECT_EQ(b.items[n].owner, &b) << "item " << n + 1;
    }

    const GrdCustomBlock* ca = a.customBlocks.get();
    const GrdCustomBlock* cb = b.customBlocks.get();
    for (; ca != nullptr && cb != nullptr; ca = ca->next.get(), cb = cb->next.get()) {
        EXPECT_EQ(ca->type, cb->type);
        EXPECT_STREQ(ca->name.orEmpty(), cb->name.orEmpty());
        EXPECT_EQ(ca->count, cb->count);
        EXPECT_TRUE(sameBits(ca->data.get(), cb->data.get(),
                             static_cast<size_t>(ca->count) * static_cast<size_t>(grdSimpleTypeSize(ca->type))));
    }
    EXPECT_EQ(ca, nullptr) << "custom blocks lost";
    EXPECT_EQ(cb, nullptr) << "custom blocks added";
}

// ---- Hand-built streams ----------------------------------------------------------

// One record of a hand-built block.
struct Rec {
    int32_t type;
    uint32_t count;
    std::vector<uint8_t> bytes;
};

template <class T>
Rec recordOf(int32_t type, std::initializer_list<T> values) {
    Rec r{type, static_cast<uint32_t>(values.size()), std::vector<uint8_t>(values.size() * sizeof(T))};
    if (values.size() > 0) std::memcpy(r.bytes.data(), values.begin(), r.bytes.size());
    return r;
}
inline Rec ints(std::initializer_list<int32_t> v) { return recordOf(RCF_INT4, v); }
inline Rec uints(std::initializer_list<uint32_t> v) { return recordOf(RCF_UINT4, v); }
inline Rec floats(std::initializer_list<float> v) { return recordOf(RCF_FLOAT, v); }
inline Rec doubles(std::initializer_list<double> v) { return recordOf(RCF_DOUBLE, v); }
inline Rec shorts(std::initializer_list<int16_t> v) { return recordOf(RCF_INT2, v); }
inline Rec text(const char* s) {
    const size_t n = std::strlen(s) + 1;
    Rec r{RCF_BYTE, static_cast<uint32_t>(n), std::vector<uint8_t>(n)};
    std::memcpy(r.bytes.data(), s, n);
    return r;
}
inline Rec doublesN(size_t n, double first = 0.0) {
    Rec r{RCF_DOUBLE, static_cast<uint32_t>(n), std::vector<uint8_t>(n * sizeof(double))};
    for (size_t i = 0; i < n; ++i) {
        const double v = first + static_cast<double>(i);
        std::memcpy(r.bytes.data() + i * sizeof(double), &v, sizeof(double));
    }
    return r;
}

// A record file written block by block by hand, closed on destruction.
class RawFile {
public:
    explicit RawFile(const std::string& path) : file_(FOpenFileCreate(path.c_str(), 0)) {
        EXPECT_NE(file_, nullptr);
        rcfSeekAppBase(file_);
    }
    ~RawFile() { close(); }
    RawFile(const RawFile&) = delete;
    RawFile& operator=(const RawFile&) = delete;

    RawFile& block(uint16_t tag, std::initializer_list<Rec> records = {}) {
        LrecNode* head = nullptr;
        for (const Rec& r : records) {
            LrecNode* node = rcfLrecNodeNew(r.type, r.count, r.bytes.data(), 1, head);
            if (head == nullptr) head = node;
        }
        EXPECT_EQ(rcfBlockWrite(tag, file_, head), 0);
        rcfLrecListFree(&head);
        return *this;
    }
    // A bare data record outside any block.
    RawFile& record(const Rec& r) {
        EXPECT_EQ(rcfLrecWrite(file_, r.type, r.count, r.bytes.data()), 0);
        return *this;
    }
    // The usual start: header section (file type 1, statistics type stats),
    // an equidistant time axis, item section.
    RawFile& start(int32_t items, int32_t stats = F_ITEM_STATS_GLOBAL) {
        block(kTagHeaderStart).block(10004, {shorts({1})}).block(10005, {ints({stats})}).block(kTagTimeStart);
        block(20051, {ints({1400}), doubles({0.0, 1.0}), ints({0, 0})});
        return block(kTagItemStart).block(kTagItemCount, {ints({items})});
    }
    // A 30005 block of an item of the undefined quantity type and unit 0.
    RawFile& item(const char* name = "item") {
        return block(kTagItem, {ints({QTY_ITEM_UNDEFINED}), text(name), ints({0}), ints({1}),
                                doubles({1.0, 2.0, 3.0}), floats({4, 5, 6}), floats({7, 8, 9})});
    }
    void close() {
        if (file_ != nullptr) {
            EXPECT_EQ(FCloseFile(&file_), 0);
        }
    }

private:
    FileHandle file_;
};

// ---- Byte order ----------------------------------------------------------------------

inline void reverseBytes(std::vector<uint8_t>& b, size_t at, size_t n) {
    for (size_t i = 0; i < n / 2; ++i) std::swap(b[at + i], b[at + n - 1 - i]);
}

// A record file rewritten record by record into the opposite byte order:
// a host-order file as a machine of the other order would have written it,
// and such a file back into host order.
inline std::vector<uint8_t> swapRecordFile(std::vector<uint8_t> b) {
    if (b.size() < 8) return b;
    const bool hostOrder = std::memcmp(b.data(), "QTA_", 4) == 0;
    reverseBytes(b, 0, 4);  // file tag
    reverseBytes(b, 4, 4);  // application tag
    size_t p = 8;
    while (p < b.size() && b[p] != 0x1A) ++p;
    ++p;
    for (int group = 0; group < 2; ++group) {  // stamps and versions
        for (int i = 0; i < 6; ++i, p += 2) reverseBytes(b, p, 2);
        for (int i = 0; i < 2; ++i, p += 4) reverseBytes(b, p, 4);
    }
    for (int i = 0; i < 2; ++i, p += 4) reverseBytes(b, p, 4);  // reserved words
    while (p < b.size()) {
        const auto type = static_cast<int8_t>(b[p]);
        if (type > 0) {
            if (p + 5 > b.size()) break;
            uint32_t count = 0;
            if (hostOrder) std::memcpy(&count, &b[p + 1], 4);
            reverseBytes(b, p + 1, 4);
            if (!hostOrder) std::memcpy(&count, &b[p + 1], 4);
            const size_t size = rcfSimpSize(type);
            p += 5;
            if (size * count > b.size() - p) break;
            for (uint32_t i = 0; i < count; ++i, p += size) reverseBytes(b, p, size);
        } else if (b[p] == 0xFE) {
            if (p + 3 > b.size()) break;
            reverseBytes(b, p + 1, 2);
            p += 3;
        } else {
            p += 1;
        }
    }
    return b;
}

// Little-endian bytes of a value, for golden streams.
template <class T>
void putLE(std::vector<uint8_t>& out, T v) {
    uint8_t bytes[sizeof(T)];
    std::memcpy(bytes, &v, sizeof(T));
    out.insert(out.end(), bytes, bytes + sizeof(T));
}

}  // namespace streamtest
