// Helpers of the cross-section tests: cross sections filled with recognisable
// values, whole files written through the API, hand-made files of older
// layouts written record by record, and a table that frees itself.
#pragma once

#include <cstdint>
#include <cstring>
#include <string>
#include <vector>

#include <gtest/gtest.h>

#include "rcf/rcf_internal.h"
#include "tova/xfs.h"
#include "xsec/xsec.h"

namespace xfstest {

// Reads a member of the packed record by value. The assertions bind
// references, which must not refer to the record's unaligned members.
template <class T>
T get(T value) {
    return value;
}

// Set when a test of this process has loaded a file (the table version is
// then no longer the initial one).
inline bool& loadedOnce() {
    static bool loaded = false;
    return loaded;
}

// A loaded table, freed at the end of the scope.
struct Table {
    XsecTableHandle h = nullptr;
    int32_t status = -1;
    Table() = default;
    explicit Table(const std::string& path, uint32_t flags = 0) { load(path, flags); }
    ~Table() { xfsXsecTableFree(&h); }
    Table(const Table&) = delete;
    Table& operator=(const Table&) = delete;
    int32_t load(const std::string& path, uint32_t flags = 0) {
        xfsXsecTableFree(&h);
        loadedOnce() = true;
        status = xfsXsecTableLoad(path.c_str(), &h, flags);
        return status;
    }
};

// Value i of column c of a set, derived from a seed so that every element of
// every cross section differs.
inline double sample(double seed, int column, uint32_t i) { return seed * 1000.0 + column * 100.0 + i * 0.25; }

// Sizes and fills every data set of x.
inline void fillAll(XsecHandle x, double seed, uint16_t raw = 5, uint16_t sel = 2, uint16_t prc = 4,
                    uint16_t coords = 3) {
    ASSERT_EQ(xfsXsecSetNoRaw(x, raw), 1);
    ASSERT_EQ(xfsXsecSetNoSel(x, sel), 1);
    ASSERT_EQ(xfsXsecSetNoPrc(x, prc), 1);
    ASSERT_EQ(xfsXsecSetNoCoords(x, coords), 1);
    for (uint32_t i = 0; i < raw; ++i) {
        for (int c = 0; c < 3; ++c) x->raw[c][i] = sample(seed, c, i);
        x->raw3[i] = sample(seed, 3, i);
        x->rawMark[0][i] = static_cast<uint16_t>(i + 1);
        x->rawMark[1][i] = static_cast<uint16_t>(1000 + i);
    }
    for (uint32_t i = 0; i < sel; ++i) x->sel[i] = sample(seed, 10, i);
    for (uint32_t i = 0; i < prc; ++i)
        for (int c = 0; c < 6; ++c) x->prc[c][i] = sample(seed, 20 + c, i);
    for (uint32_t i = 0; i < coords; ++i)
        for (int c = 0; c < 3; ++c) x->coords[c][i] = sample(seed, 30 + c, i);
}

// Compares every field of two records except owner.
inline void expectSameRecord(const XsecData* a, const XsecData* b) {
    ASSERT_NE(a, nullptr);
    ASSERT_NE(b, nullptr);
    EXPECT_STREQ(a->primaryName, b->primaryName);
    EXPECT_STREQ(a->secondaryName, b->secondaryName);
    EXPECT_STREQ(a->extraName, b->extraName);
    EXPECT_EQ(get(a->keyValue), get(b->keyValue));
    for (int i = 0; i < 25; ++i) EXPECT_EQ(a->headerWords[i], b->headerWords[i]) << "word " << i;
    for (int i = 0; i < 23; ++i) EXPECT_EQ(get(a->headerValues[i]), get(b->headerValues[i])) << "value " << i;
    ASSERT_EQ(get(a->noRaw), get(b->noRaw));
    ASSERT_EQ(get(a->noSel), get(b->noSel));
    ASSERT_EQ(get(a->noPrc), get(b->noPrc));
    ASSERT_EQ(get(a->noCoords), get(b->noCoords));
    for (uint32_t i = 0; i < a->noRaw; ++i) {
        for (int c = 0; c < 3; ++c) EXPECT_EQ(a->raw[c][i], b->raw[c][i]);
        EXPECT_EQ(a->raw3[i], b->raw3[i]);
        EXPECT_EQ(a->rawMark[0][i], b->rawMark[0][i]);
        EXPECT_EQ(a->rawMark[1][i], b->rawMark[1][i]);
    }
    for (uint32_t i = 0; i < a->noSel; ++i) EXPECT_EQ(a->sel[i], b->sel[i]);
    for (uint32_t i = 0; i < a->noPrc; ++i)
        for (int c = 0; c < 6; ++c) EXPECT_EQ(a->prc[c][i], b->prc[c][i]);
    for (uint32_t i = 0; i < a->noCoords; ++i)
        for (int c = 0; c < 3; ++c) EXPECT_EQ(a->coords[c][i], b->coords[c][i]);
}

// Writes the cross sections in the order given through the API.
inline void writeFile(const std::string& path, const std::vector<XsecHandle>& xsecs) {
    FileHandle f = nullptr;
    ASSERT_EQ(xfsFileOpenCreate(path.c_str(), &f), 0);
    for (XsecHandle x : xsecs) ASSERT_EQ(xfsXsecWrite(x, f), 0);
    ASSERT_EQ(xfsFileClose(&f), 0);
}

// Cross sections made by a test and freed at the end of its scope.
struct Owned {
    std::vector<XsecHandle> all;
    ~Owned() {
        for (XsecHandle& x : all) xfsXsecFree(&x);
    }
    XsecHandle add(const char* primary, double key, const char* secondary, const char* extra = nullptr) {
        XsecHandle x = xfsXsecCreateEx(primary, key, secondary, extra);
        EXPECT_NE(x, nullptr);
        all.push_back(x);
        return x;
    }
};

// The primary names and key values of a table in walk order.
inline std::vector<std::string> walk(XsecTableHandle table) {
    std::vector<std::string> out;
    XsecCursor cursor = nullptr;
    for (XsecHandle x = xfsXsecFind(table, "", 0.0, "", &cursor); x != nullptr; x = xfsXsecNext(table, x))
        out.push_back(std::string(x->primaryName) + "/" + x->secondaryName + "/" + std::to_string(x->keyValue) +
                      "/" + x->extraName);
    return out;
}

// One logical record written by hand.
struct Rec {
    int32_t type;
    std::vector<uint8_t> bytes;
    uint32_t count;
};

inline Rec text(const std::string& s) { return {RCF_BYTE, {s.begin(), s.end()}, static_cast<uint32_t>(s.size())}; }

template <class T>
Rec values(int32_t type, const std::vector<T>& v) {
    Rec r{type, std::vector<uint8_t>(v.size() * sizeof(T)), static_cast<uint32_t>(v.size())};
    if (!v.empty()) std::memcpy(r.bytes.data(), v.data(), r.bytes.size());
    return r;
}

inline Rec doubles(const std::vector<double>& v) { return values(RCF_DOUBLE, v); }
inline Rec words(const std::vector<uint16_t>& v) { return values(RCF_UINT2, v); }

// A cross-section file of any format version, written block by block.
class RawFile {
public:
    RawFile(const std::string& path, uint32_t version) {
        version_() = version;
        EXPECT_EQ(rcfFileOpenCreate(path.c_str(), "", &file_, &ident, 0), 0);
    }
    ~RawFile() { close(); }
    RawFile(const RawFile&) = delete;
    RawFile& operator=(const RawFile&) = delete;

    void block(uint16_t tag, const std::vector<Rec>& records) {
        LrecNode* list = nullptr;
        for (const Rec& r : records) {
            LrecNode* node = rcfLrecNodeNew(r.type, r.count, r.bytes.data(), 1, list);
            if (list == nullptr) list = node;
        }
        EXPECT_EQ(rcfBlockWrite(tag, file_, list), 0);
        rcfLrecListFree(&list);
    }
    // A key block of three (extra empty) or four records.
    void key(const std::string& primary, double value, const std::string& secondary,
             const std::string& extra = "") {
        std::vector<Rec> r{text(primary), doubles({value}), text(secondary)};
        if (!extra.empty()) r.push_back(text(extra));
        block(kXfsKeyBlock, r);
    }
    void header(const std::vector<uint16_t>& w, const std::vector<double>& v) {
        block(kXfsHeaderBlock, {words(w), doubles(v)});
    }
    FileHandle handle() const { return file_; }
    void close() { rcfFileClose(&file_); }

private:
    static uint32_t& version_() {
        static uint32_t v = kXfsFormatVersion;
        return v;
    }
    static uint32_t ident(uint32_t* version) {
        *version = version_();
        return xfsAppIdent(nullptr);
    }
    FileHandle file_ = nullptr;
};

}  // namespace xfstest
