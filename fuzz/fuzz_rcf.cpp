// Fuzz target of the record layer: record and block operations over arbitrary
// bytes behind a valid file header.
//
// Input layout:
//   byte 0      bit 0: the header is in the opposite byte order;
//               bit 1: open for editing (writes allowed), else read-only;
//               bits 2-6: length L of the operation script (0-31)
//   bytes 1..L  the script: each byte picks an operation (low 4 bits) and its
//               argument (high 4 bits); the script is repeated up to 64 steps
//   the rest    the file's body, placed after the header
// After the script, a final pass walks every record and block from the start
// of the body. Every buffer the library hands out is read in full.
#include <algorithm>
#include <cstring>
#include <vector>

#include "fuzz_common.h"
#include "grd/fileio.h"
#include "rcf/rcf_internal.h"

namespace {

constexpr int kScriptSteps = 64;
constexpr int kWalkSteps = 100000;
constexpr const char* kModule = "fuzz_rcf";

uint32_t fuzzApp(uint32_t* version) {
    *version = 3;
    uint32_t tag = 0;
    std::memcpy(&tag, "FZR_", 4);
    return tag;
}

// The header as the library writes it (with fixed stamps), in both byte
// orders.
struct Headers {
    std::vector<uint8_t> native;
    std::vector<uint8_t> swapped;
};

void reverse(std::vector<uint8_t>& b, size_t at, size_t width) { std::reverse(b.begin() + at, b.begin() + at + width); }

Headers makeHeaders() {
    fuzz::MemFile file("fuzz-rcf-header");
    FileHandle h = nullptr;
    if (rcfFileOpenCreate(file.path(), "", &h, fuzzApp, 0) != 0) fuzz::broken("cannot create a header");
    const uint32_t rcfBase = rcfGetRCFbase(h);
    const uint32_t appBase = rcfGetAppBase(h);
    rcfFileClose(&h);
    Headers headers;
    headers.native.resize(appBase);
    FILE* in = std::fopen(file.path(), "rb");
    if (in == nullptr || std::fread(headers.native.data(), 1, appBase, in) != appBase) fuzz::broken("header read");
    std::fclose(in);
    const int16_t stamp[6] = {2001, 2, 3, 4, 5, 6};
    std::memcpy(&headers.native[rcfBase], stamp, sizeof stamp);
    std::memcpy(&headers.native[rcfBase + 20], stamp, sizeof stamp);

    // Opposite order: the tag, the application tag and every stamp and
    // version field reversed.
    headers.swapped = headers.native;
    std::vector<uint8_t>& s = headers.swapped;
    reverse(s, 0, 4);
    reverse(s, 4, 4);
    for (uint32_t group = 0; group < 2; ++group) {
        const uint32_t at = rcfBase + group * 20;
        for (uint32_t i = 0; i < 6; ++i) reverse(s, at + 2 * i, 2);
        reverse(s, at + 12, 4);
        reverse(s, at + 16, 4);
    }
    return headers;
}

void touchList(const LrecNode* list, uint32_t nodes) {
    uint32_t seen = 0;
    for (const LrecNode* n = list; n != nullptr; n = n->next, ++seen) {
        if (n->data != nullptr) fuzz::keep(fuzz::touch(n->data, uint64_t{rcfSimpSize(n->type)} * n->count));
    }
    if (seen != nodes) fuzz::broken("block node count differs from its list");
}

void readBlock(FileHandle f) {
    uint32_t nodes = 0;
    LrecNode* list = nullptr;
    rcfBlockRead(f, &nodes, &list);
    touchList(list, nodes);
    rcfLrecListFree(&list);
}

void readAlloc(FileHandle f) {
    int32_t type = 0;
    uint32_t count = 0;
    void* data = rcfLrecReadAlloc(f, &type, &count);
    if (data != nullptr) fuzz::keep(fuzz::touch(data, uint64_t{rcfSimpSize(type)} * count));
    rcfLrecFree(&data);
}

// One script step. arg is 0-15.
void step(FileHandle f, int op, int arg, uint64_t fileSize) {
    alignas(8) static unsigned char buffer[4096];
    switch (op) {
    case 0: {
        uint32_t count = 0;
        fuzz::keep(static_cast<uint32_t>(rcfQuery(f, &count)) + count);
        break;
    }
    case 1: readAlloc(f); break;
    case 2: {
        const int32_t type = arg % 8;
        const uint32_t size = std::max<uint32_t>(1, rcfSimpSize(type));
        const uint32_t maxCount = (sizeof buffer / size) >> (arg / 8);
        const uint32_t got = rcfLrecRead(f, type, maxCount, buffer);
        if (got > maxCount) fuzz::broken("rcfLrecRead returned more than the maximum");
        fuzz::keep(fuzz::touch(buffer, uint64_t{got} * size));
        break;
    }
    case 3: rcfSkip(f); break;
    case 4: readBlock(f); break;
    case 5: rcfBlockSkip(f); break;
    case 6: fuzz::keep(static_cast<uint64_t>(rcfTell64(f)) + static_cast<uint32_t>(rcfTell(f))); break;
    case 7:
        if (arg < 8) {
            rcfSeekAppBase(f);
        } else {
            // Somewhere in or just beyond the file, or from its end.
            const uint64_t to = fileSize * static_cast<uint64_t>(arg - 8) / 7;
            rcfSeek64(f, static_cast<uint32_t>(to), static_cast<uint32_t>(to >> 32), arg == 15 ? 2 : 0);
        }
        break;
    case 8: fuzz::keep(static_cast<uint32_t>(rcfGetError(f))); break;
    case 9: {
        uint32_t count = 0;
        uint32_t length = 0;
        rcfPeekHeader(f, &count, &length);
        if (arg & 1) rcfUnpeekHeader(f);
        break;
    }
    case 10: rcfSkipDeferred(f, static_cast<uint32_t>(arg) * 7u); break;
    case 11: {
        std::memset(buffer, arg, 64);
        const int32_t type = arg % 8;
        rcfLrecWrite(f, type, static_cast<uint32_t>(64 / std::max<uint32_t>(1, rcfSimpSize(type))), buffer);
        break;
    }
    case 12: {
        LrecNode* list = FCreateLogicalBlock(RCF_INT2, static_cast<uint32_t>(arg), nullptr);
        FAppendToLogicalBlock(RCF_DOUBLE, 1, nullptr, list);
        grdCheckWriteLB(nullptr, static_cast<uint16_t>(arg * 4099), list, f, kModule, __LINE__);
        FFreeLogicalBlock(list);
        break;
    }
    case 13: {
        LrecNode* list = FReadLogicalBlock(f);
        uint32_t nodes = 0;
        for (const LrecNode* n = list; n != nullptr; n = n->next) ++nodes;
        touchList(list, nodes);
        FFreeLogicalBlock(list);
        break;
    }
    case 14:
        if (arg & 1) {
            FSkipLogicalBlock(f);
        } else {
            fuzz::keep(static_cast<uint32_t>(FQueryLogicalBlock(f)));
        }
        break;
    default: {
        LrecNode* list = nullptr;
        switch (arg % 4) {
        case 0: grdCheckReadTypeSize(nullptr, f, arg % 8, 0, &list, kModule, __LINE__); break;
        case 1: grdCheckSkipLR(nullptr, f, kModule, __LINE__); break;
        case 2: grdCheckPseudoSkipLR(RCF_FLOAT, static_cast<uint32_t>(arg), f); break;
        default: grdCheckReadLR(nullptr, RCF_BYTE, sizeof buffer, buffer, f, kModule, __LINE__); break;
        }
        uint32_t nodes = 0;
        for (const LrecNode* n = list; n != nullptr; n = n->next) ++nodes;
        touchList(list, nodes);
        FFreeLogicalBlock(list);
        break;
    }
    }
}

// Every record and block from the start of the body, as a reader would.
void walk(FileHandle f) {
    rcfGetError(f);
    rcfSeekAppBase(f);
    for (int i = 0; i < kWalkSteps && rcfPeekError(f) == 0; ++i) {
        uint32_t count = 0;
        const int32_t type = rcfQuery(f, &count);
        if (type == 0) break;
        if (type == RCF_BLOCK) {
            readBlock(f);
        } else if (type > 0) {
            readAlloc(f);
        } else {
            rcfSkip(f);
        }
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static const Headers headers = makeHeaders();
    static fuzz::MemFile file("fuzz-rcf");
    if (size == 0) return 0;
    const unsigned flags = data[0];
    const size_t scriptLength = std::min<size_t>((flags >> 2) & 31u, size - 1);
    const uint8_t* script = data + 1;
    const uint8_t* body = script + scriptLength;
    const size_t bodySize = size - 1 - scriptLength;

    const std::vector<uint8_t>& header = (flags & 1u) != 0 ? headers.swapped : headers.native;
    std::vector<uint8_t> bytes(header);
    bytes.insert(bytes.end(), body, body + bodySize);
    file.assign(bytes.data(), bytes.size());

    FileHandle f = nullptr;
    uint32_t appTag = 0;
    const int32_t status = (flags & 2u) != 0 ? rcfFileOpenEdit(file.path(), &f, fuzzApp, &appTag)
                                             : rcfFileOpenRead(file.path(), &f, fuzzApp, &appTag);
    if (status != 0 || f == nullptr) fuzz::broken("a valid header did not open");
    for (const char* text : {rcfGetFileCreationDate(f), rcfGetFileEditTime(f), rcfGetFilename(f)})
        fuzz::keep(fuzz::touch(text, std::strlen(text)));

    for (int i = 0; scriptLength != 0 && i < kScriptSteps; ++i) {
        const uint8_t op = script[static_cast<size_t>(i) % scriptLength];
        step(f, op & 15, op >> 4, bytes.size());
    }
    walk(f);
    if (rcfFileClose(&f) != 0 || f != nullptr) fuzz::broken("close failed");
    return 0;
}
