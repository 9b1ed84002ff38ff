// Cross sections: the CTDxSec object (its record, data sets and consistency
// rules), the key order, building a cross section from the key and header
// blocks of a file and writing one back as blocks.
//
// The record is packed on 2-byte boundaries, so its pointer and double
// members are generally unaligned: generic code reaches them by byte offset
// through memcpy, never through pointers to members.
#include <algorithm>
#include <cstddef>
#include <cstdlib>
#include <cstring>
#include <vector>

#include "xsec/xsec.h"

// The record is a fixed binary interface; pin its layout.
#if UINTPTR_MAX == 0xFFFFFFFFu
static_assert(offsetof(XsecData, keyValue) == 0);
static_assert(offsetof(XsecData, primaryName) == 8);
static_assert(offsetof(XsecData, secondaryName) == 12);
static_assert(offsetof(XsecData, extraName) == 16);
static_assert(offsetof(XsecData, headerWords) == 20);
static_assert(offsetof(XsecData, headerValues) == 70);
static_assert(offsetof(XsecData, noRaw) == 254);
static_assert(offsetof(XsecData, raw) == 258);
static_assert(offsetof(XsecData, noSel) == 270);
static_assert(offsetof(XsecData, sel) == 274);
static_assert(offsetof(XsecData, noPrc) == 278);
static_assert(offsetof(XsecData, prc) == 282);
static_assert(offsetof(XsecData, raw3) == 306);
static_assert(offsetof(XsecData, rawMark) == 310);
static_assert(offsetof(XsecData, noCoords) == 318);
static_assert(offsetof(XsecData, coords) == 322);
static_assert(offsetof(XsecData, owner) == 334);
static_assert(sizeof(XsecData) == 338);
#elif UINTPTR_MAX == 0xFFFFFFFFFFFFFFFFu
static_assert(offsetof(XsecData, keyValue) == 0);
static_assert(offsetof(XsecData, primaryName) == 8);
static_assert(offsetof(XsecData, secondaryName) == 16);
static_assert(offsetof(XsecData, extraName) == 24);
static_assert(offsetof(XsecData, headerWords) == 32);
static_assert(offsetof(XsecData, headerValues) == 82);
static_assert(offsetof(XsecData, noRaw) == 266);
static_assert(offsetof(XsecData, raw) == 270);
static_assert(offsetof(XsecData, noSel) == 294);
static_assert(offsetof(XsecData, sel) == 298);
static_assert(offsetof(XsecData, noPrc) == 306);
static_assert(offsetof(XsecData, prc) == 310);
static_assert(offsetof(XsecData, raw3) == 358);
static_assert(offsetof(XsecData, rawMark) == 366);
static_assert(offsetof(XsecData, noCoords) == 382);
static_assert(offsetof(XsecData, coords) == 386);
static_assert(offsetof(XsecData, owner) == 410);
static_assert(sizeof(XsecData) == 418);
#else
#error "unsupported pointer width"
#endif

namespace {

constexpr size_t kPtr = sizeof(void*);
constexpr int kHeaderWords = 25;
constexpr int kHeaderValues = 23;

// One column of a data set: where its pointer sits in the record and the size
// of its elements.
struct Column {
    size_t offset;
    uint32_t elemSize;
};

// A data set: its count field and its columns. The raw set has six columns;
// columns 3-5 are optional as a group.
struct SetShape {
    size_t countOffset;
    uint32_t columns;
    Column cols[6];
};

constexpr SetShape kRawShape{offsetof(XsecData, noRaw),
                             6,
                             {{offsetof(XsecData, raw), 8},
                              {offsetof(XsecData, raw) + kPtr, 8},
                              {offsetof(XsecData, raw) + 2 * kPtr, 8},
                              {offsetof(XsecData, raw3), 8},
                              {offsetof(XsecData, rawMark), 2},
                              {offsetof(XsecData, rawMark) + kPtr, 2}}};
constexpr SetShape kSelShape{offsetof(XsecData, noSel), 1, {{offsetof(XsecData, sel), 8}}};
constexpr SetShape kPrcShape{offsetof(XsecData, noPrc),
                             6,
                             {{offsetof(XsecData, prc), 8},
                              {offsetof(XsecData, prc) + kPtr, 8},
                              {offsetof(XsecData, prc) + 2 * kPtr, 8},
                              {offsetof(XsecData, prc) + 3 * kPtr, 8},
                              {offsetof(XsecData, prc) + 4 * kPtr, 8},
                              {offsetof(XsecData, prc) + 5 * kPtr, 8}}};
constexpr SetShape kCoordShape{offsetof(XsecData, noCoords),
                               3,
                               {{offsetof(XsecData, coords), 8},
                                {offsetof(XsecData, coords) + kPtr, 8},
                                {offsetof(XsecData, coords) + 2 * kPtr, 8}}};
// Columns of the raw set that older files carry.
constexpr uint32_t kRawOldColumns = 3;

const SetShape& shapeOf(XsecSet set) {
    switch (set) {
        case XsecSet::Raw: return kRawShape;
        case XsecSet::Sel: return kSelShape;
        case XsecSet::Prc: return kPrcShape;
        case XsecSet::Coords: break;
    }
    return kCoordShape;
}

template <class T>
T loadAt(const XsecData& rec, size_t offset) {
    T value;
    std::memcpy(&value, reinterpret_cast<const unsigned char*>(&rec) + offset, sizeof value);
    return value;
}

template <class T>
void storeAt(XsecData& rec, size_t offset, T value) {
    std::memcpy(reinterpret_cast<unsigned char*>(&rec) + offset, &value, sizeof value);
}

void* column(const XsecData& rec, const SetShape& shape, uint32_t i) {
    return loadAt<void*>(rec, shape.cols[i].offset);
}

void setColumn(XsecData& rec, const SetShape& shape, uint32_t i, void* data) {
    storeAt<void*>(rec, shape.cols[i].offset, data);
}

// A malloc'd copy of text (length plus terminator), or null.
char* copyText(const char* text, uint64_t length) {
    if (length >= SIZE_MAX) return nullptr;
    auto* copy = static_cast<char*>(std::malloc(static_cast<size_t>(length) + 1));
    if (copy == nullptr) return nullptr;
    std::memcpy(copy, text, static_cast<size_t>(length));
    copy[length] = '\0';
    return copy;
}

char* copyText(const char* text) { return copyText(text, std::strlen(text)); }

// Bytes a record's data buffer holds.
uint64_t recordBytes(const LrecNode* node) {
    if (node->data == nullptr) return 0;
    return uint64_t{rcfSimpSize(node->type)} * node->count;
}

int compareNames(const char* a, const char* b) {
    const auto* x = reinterpret_cast<const unsigned char*>(a != nullptr ? a : "");
    const auto* y = reinterpret_cast<const unsigned char*>(b != nullptr ? b : "");
    for (;; ++x, ++y) {
        // ASCII lowering only: the order must not depend on the locale.
        const int cx = (*x >= 'A' && *x <= 'Z') ? *x + ('a' - 'A') : *x;
        const int cy = (*y >= 'A' && *y <= 'Z') ? *y + ('a' - 'A') : *y;
        if (cx != cy) return cx < cy ? -1 : 1;
        if (cx == 0) return 0;
    }
}

// Header layout of older files: how many bytes of header words and how many
// header values the header records of a file of this version carry. Older
// versions tie the counts to the shape of the key block.
struct HeaderLayout {
    size_t wordBytes;
    size_t valueCount;
};

HeaderLayout headerLayout(uint32_t version, uint32_t keyRecords) {
    const bool fourKeys = keyRecords == 4;
    const size_t oldValues = fourKeys ? 10 : 9;
    if (version >= 105) return {50, 23};
    if (version == 104) return {48, 15};
    if (version == 103) return {46, oldValues};
    if (version == 102) return {42, oldValues};
    return {fourKeys ? 40u : 32u, oldValues};
}

}  // namespace

int xsecKeyOrder(const char* primaryA, const char* secondaryA, double keyA, const char* primaryB,
                 const char* secondaryB, double keyB) {
    if (int c = compareNames(primaryA, primaryB); c != 0) return c;
    if (int c = compareNames(secondaryA, secondaryB); c != 0) return c;
    if (keyA < keyB) return -1;
    if (keyA > keyB) return 1;
    return 0;
}

// ---- Construction -----------------------------------------------------------

void CTDxSec::initRecord() {
    std::memset(&rec, 0, sizeof rec);
    rec.headerWords[23] = 2;
    for (int i = 10; i < kHeaderValues; ++i) rec.headerValues[i] = 1.0;
    rec.headerValues[15] = 0.001;
    rec.owner = this;
}

bool CTDxSec::copyNames(const char* primaryName, const char* secondaryName) {
    rec.primaryName = copyText(primaryName);
    rec.secondaryName = copyText(secondaryName);
    return rec.primaryName != nullptr && rec.secondaryName != nullptr;
}

CTDxSec::CTDxSec(const char* primaryName, double keyValue, const char* secondaryName, const char* extraName) {
    xsecRegister(this);
    initRecord();
    if (primaryName == nullptr || secondaryName == nullptr) {
        releaseAll();
        return;
    }
    rec.keyValue = keyValue;
    bool ok = copyNames(primaryName, secondaryName);
    rec.extraName = copyText(extraName != nullptr && *extraName != '\0' ? extraName : " ");
    // The extra name is never null: a failed copy makes the object invalid too.
    ok = ok && rec.extraName != nullptr;
    validFlag = ok ? 1 : 0;
    if (!ok) releaseAll();
}

CTDxSec::CTDxSec(const char* primaryName, double keyValue, const char* secondaryName)
    : CTDxSec(primaryName, keyValue, secondaryName, nullptr) {}

CTDxSec::CTDxSec(const LrecNode* keyRecords, const LrecNode* headerRecords, uint32_t formatVersion) {
    xsecRegister(this);
    initRecord();

    // Key block: primary name, key value (first 8 bytes), secondary name and
    // an optional extra name.
    uint32_t keyCount = 0;
    bool ok = true;
    for (const LrecNode* node = keyRecords; node != nullptr; node = node->next) {
        ++keyCount;
        if (keyCount > 4) {
            ok = false;
            break;
        }
        const uint64_t bytes = recordBytes(node);
        const auto* text = static_cast<const char*>(node->data);
        switch (keyCount) {
            case 1: rec.primaryName = copyText(text != nullptr ? text : "", bytes); break;
            case 2:
                // A key shorter than a double is not a key.
                if (bytes < sizeof(double)) {
                    ok = false;
                } else {
                    double key;
                    std::memcpy(&key, node->data, sizeof key);
                    rec.keyValue = key;
                }
                break;
            case 3: rec.secondaryName = copyText(text != nullptr ? text : "", bytes); break;
            default: rec.extraName = copyText(text != nullptr ? text : "", bytes); break;
        }
    }
    if (rec.extraName == nullptr) rec.extraName = copyText(" ");
    ok = ok && rec.primaryName != nullptr && rec.secondaryName != nullptr && rec.extraName != nullptr;

    // Header block: exactly two records, copied over the start of the header
    // words and values as far as the file version says (and the records hold).
    const LrecNode* words = headerRecords;
    const LrecNode* values = words != nullptr ? words->next : nullptr;
    if (values == nullptr || values->next != nullptr) ok = false;
    if (ok) {
        const HeaderLayout layout = headerLayout(formatVersion, keyCount);
        const size_t wordBytes = static_cast<size_t>(std::min<uint64_t>(layout.wordBytes, recordBytes(words)));
        const size_t valueBytes =
            static_cast<size_t>(std::min<uint64_t>(layout.valueCount * sizeof(double), recordBytes(values)));
        auto* base = reinterpret_cast<unsigned char*>(&rec);
        if (wordBytes != 0) std::memcpy(base + offsetof(XsecData, headerWords), words->data, wordBytes);
        if (valueBytes != 0) std::memcpy(base + offsetof(XsecData, headerValues), values->data, valueBytes);
    }
    validFlag = ok ? 1 : 0;
    if (!ok) releaseAll();
}

CTDxSec::~CTDxSec() {
    releaseAll();
    xsecUnregister(this);
}

void CTDxSec::afterRead() {}

void CTDxSec::releaseAll() {
    std::free(rec.primaryName);
    std::free(rec.secondaryName);
    std::free(rec.extraName);
    for (XsecSet set : {XsecSet::Raw, XsecSet::Sel, XsecSet::Prc, XsecSet::Coords}) freeSet(set);
    std::memset(&rec, 0, sizeof rec);
    validFlag = 0;
}

// ---- Data sets --------------------------------------------------------------

void CTDxSec::freeSet(XsecSet set) {
    const SetShape& shape = shapeOf(set);
    for (uint32_t i = 0; i < shape.columns; ++i) {
        std::free(column(rec, shape, i));
        setColumn(rec, shape, i, nullptr);
    }
    storeAt<uint32_t>(rec, shape.countOffset, 0);
}

uint32_t CTDxSec::checkSet(XsecSet set, uint32_t n) {
    const SetShape& shape = shapeOf(set);
    const uint32_t required = set == XsecSet::Raw ? kRawOldColumns : shape.columns;
    uint32_t present = 0;
    for (uint32_t i = 0; i < shape.columns; ++i) present += column(rec, shape, i) != nullptr ? 1 : 0;
    bool ok;
    if (n == 0) {
        ok = present == 0;
    } else {
        uint32_t leading = 0;
        for (uint32_t i = 0; i < required; ++i) leading += column(rec, shape, i) != nullptr ? 1 : 0;
        // Raw columns 3-5 are all present or all absent.
        ok = leading == required && (present == required || present == shape.columns);
    }
    if (!ok) {
        freeSet(set);
        validFlag = 0;
        return 0;
    }
    storeAt<uint32_t>(rec, shape.countOffset, n);
    validFlag = 1;
    return 1;
}

uint32_t CTDxSec::setCount(XsecSet set, uint16_t n) {
    if (!validFlag) return 0;
    freeSet(set);
    if (n == 0) return validFlag;
    const SetShape& shape = shapeOf(set);
    for (uint32_t i = 0; i < shape.columns; ++i) setColumn(rec, shape, i, std::calloc(n, shape.cols[i].elemSize));
    return checkSet(set, n);
}

uint32_t CTDxSec::takeRecords(XsecSet set, LrecNode* records) {
    // An invalid object stays invalid: it takes nothing.
    if (!validFlag) return 0;
    const SetShape& shape = shapeOf(set);

    // The block fits when it has exactly `columns` records of one count, each
    // carrying data of its column's element size.
    auto fits = [&](uint32_t columns, uint32_t* count) {
        uint32_t i = 0;
        for (const LrecNode* node = records; node != nullptr; node = node->next, ++i) {
            if (i >= columns) return false;
            if (i == 0) *count = node->count;
            if (node->count != *count) return false;
            if (*count != 0 &&
                (node->data == nullptr || rcfSimpSize(node->type) != shape.cols[i].elemSize))
                return false;
        }
        return i == columns;
    };

    uint32_t n = 0;
    // Older raw blocks carry only columns 0-2; the others are zero-filled.
    if (!fits(shape.columns, &n) && (set != XsecSet::Raw || !fits(kRawOldColumns, &n))) {
        validFlag = 0;
        return 0;
    }

    freeSet(set);
    uint32_t i = 0;
    for (LrecNode* node = records; node != nullptr; node = node->next, ++i)
        setColumn(rec, shape, i, n != 0 ? rcfLrecDetachData(node) : nullptr);
    for (; i < shape.columns && n != 0; ++i) setColumn(rec, shape, i, std::calloc(n, shape.cols[i].elemSize));
    return checkSet(set, n);
}

// ---- Key order --------------------------------------------------------------

int CTDxSec::keyOrder(const CTDxSec& other) const {
    return xsecKeyOrder(rec.primaryName, rec.secondaryName, rec.keyValue, other.rec.primaryName,
                        other.rec.secondaryName, other.rec.keyValue);
}

bool CTDxSec::compareKey(const CTDxSec& other, int wantedSign) const { return keyOrder(other) == wantedSign; }

// ---- Writing ----------------------------------------------------------------

namespace {

// A chain of record nodes on the stack, lent to the block writer: the nodes
// point at the cross section's own data and own nothing.
class BlockRecords {
public:
    void add(int32_t type, uint32_t count, const void* data) {
        LrecNode& node = nodes_[used_];
        node = LrecNode{type, count, 0, const_cast<void*>(data), nullptr};
        if (used_ > 0) nodes_[used_ - 1].next = &node;
        ++used_;
    }
    // A name: its bytes without terminator; an empty name is stored as a
    // single zero byte, since a record of no elements is never written and
    // the key block would lose its shape.
    void addName(const char* name) {
        const size_t length = std::strlen(name);
        add(RCF_BYTE, length != 0 ? static_cast<uint32_t>(length) : 1u, length != 0 ? name : "");
    }
    int32_t write(uint16_t tag, FileHandle file) { return rcfBlockWrite(tag, file, used_ > 0 ? nodes_ : nullptr); }

private:
    LrecNode nodes_[6]{};
    uint32_t used_ = 0;
};

}  // namespace

int32_t CTDxSec::write(FileHandle file) {
    if (!validFlag || rec.primaryName == nullptr || rec.secondaryName == nullptr || rec.extraName == nullptr)
        return F_ERR_VALUE;

    // Every non-empty set must have its arrays (callers may have changed the
    // record); raw columns 3-5 that are missing are written as zeros.
    size_t zeroBytes = 0;
    for (XsecSet set : {XsecSet::Raw, XsecSet::Sel, XsecSet::Prc, XsecSet::Coords}) {
        const SetShape& shape = shapeOf(set);
        const uint32_t n = loadAt<uint32_t>(rec, shape.countOffset);
        if (n == 0) continue;
        const uint32_t required = set == XsecSet::Raw ? kRawOldColumns : shape.columns;
        for (uint32_t i = 0; i < shape.columns; ++i) {
            if (column(rec, shape, i) != nullptr) continue;
            if (i < required) return F_ERR_VALUE;
            zeroBytes = size_t{n} * sizeof(double);
        }
    }

    if (int32_t pending = rcfPeekError(file); pending != 0) return pending;
    std::vector<unsigned char> zeros(zeroBytes);

    const double keyValue = rec.keyValue;
    BlockRecords key;
    key.addName(rec.primaryName);
    key.add(RCF_DOUBLE, 1, &keyValue);
    key.addName(rec.secondaryName);
    key.addName(rec.extraName);
    key.write(kXfsKeyBlock, file);

    const auto* base = reinterpret_cast<const unsigned char*>(&rec);
    BlockRecords header;
    header.add(RCF_UINT2, kHeaderWords, base + offsetof(XsecData, headerWords));
    header.add(RCF_DOUBLE, kHeaderValues, base + offsetof(XsecData, headerValues));
    header.write(kXfsHeaderBlock, file);

    const std::pair<XsecSet, uint16_t> sets[] = {{XsecSet::Raw, kXfsRawBlock},
                                                 {XsecSet::Sel, kXfsSelBlock},
                                                 {XsecSet::Prc, kXfsPrcBlock},
                                                 {XsecSet::Coords, kXfsCoordBlock}};
    for (const auto& [set, tag] : sets) {
        const SetShape& shape = shapeOf(set);
        const uint32_t n = loadAt<uint32_t>(rec, shape.countOffset);
        if (n == 0) continue;
        BlockRecords data;
        for (uint32_t i = 0; i < shape.columns; ++i) {
            const void* values = column(rec, shape, i);
            const int32_t type = shape.cols[i].elemSize == 8 ? RCF_DOUBLE : RCF_UINT2;
            data.add(type, n, values != nullptr ? values : zeros.data());
        }
        data.write(tag, file);
    }
    return rcfPeekError(file);
}
