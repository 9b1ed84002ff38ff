// Record-file layer, module rcf: the object behind a FileHandle, the fixed
// file header (create, open, edit-stamp rewrite), the sticky error, the raw
// transfers with byte swapping for foreign-order files, the record-header
// look-ahead, deferred and short skips, positioning, logical records and the
// simple-type table. Blocks and record lists live in rcfblock.cpp.
#include <algorithm>
#include <array>
#include <atomic>
#include <chrono>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <new>
#include <string>

#include "common/capi.h"
#include "platform/platform.h"
#include "rcf/rcf_internal.h"

namespace {

constexpr const char* kModule = "..\\rcf\\rcf";
constexpr char kTag[4] = {'Q', 'T', 'A', '_'};
constexpr char kBanner[] = " TOVA Deck - this file contains binary data, do not edit";
constexpr uint32_t kNoAppTag = 0x03030303u;
constexpr unsigned char kEndOfText = 0x1A;
constexpr unsigned char kBlockStart = 0xFE;
constexpr uint32_t kStampBlockBytes = 48;  // stamps, versions and two reserved words
constexpr int kPeekSlots = 4;
// Records of at most this many element bytes take the short way: written
// with their header in one stream call, read without asking the file's length.
constexpr uint64_t kSmallRecordBytes = 64;

#define RCF_REPORT(code) rcfReportError((code), kModule, __LINE__)
#define RCF_FAIL(h, code) ((h)->error = RCF_REPORT(code))

// ---- Platform: 64-bit stream positions, file length, local time ----------

using platform::localNow;
using platform::streamGetc;
using platform::streamLength;
using platform::streamRead;
using platform::streamSeek;
using platform::streamTell;
using platform::streamWrite;

#if defined(_MSC_VER)
inline uint16_t bswap(uint16_t v) { return _byteswap_ushort(v); }
inline uint32_t bswap(uint32_t v) { return _byteswap_ulong(v); }
inline uint64_t bswap(uint64_t v) { return _byteswap_uint64(v); }
#else
inline uint16_t bswap(uint16_t v) { return __builtin_bswap16(v); }
inline uint32_t bswap(uint32_t v) { return __builtin_bswap32(v); }
inline uint64_t bswap(uint64_t v) { return __builtin_bswap64(v); }
#endif

template <class U>
void swapEach(unsigned char* p, uint64_t count) {
    for (uint64_t i = 0; i < count; ++i, p += sizeof(U)) {
        U v;
        std::memcpy(&v, p, sizeof(U));
        v = bswap(v);
        std::memcpy(p, &v, sizeof(U));
    }
}

// Reverses each element of 2, 4 or 8 bytes; other sizes are left alone.
void swapElements(void* data, uint32_t size, uint64_t count) {
    auto* p = static_cast<unsigned char*>(data);
    switch (size) {
    case 2: swapEach<uint16_t>(p, count); break;
    case 4: swapEach<uint32_t>(p, count); break;
    case 8: swapEach<uint64_t>(p, count); break;
    default: break;
    }
}

uint32_t clockMs() {
    const auto now = std::chrono::steady_clock::now().time_since_epoch();
    return static_cast<uint32_t>(std::chrono::duration_cast<std::chrono::milliseconds>(now).count());
}

void stampNow(int16_t stamp[6]) {
    std::tm tm{};
    if (!localNow(tm)) return;
    stamp[0] = static_cast<int16_t>(tm.tm_year + 1900);
    stamp[1] = static_cast<int16_t>(tm.tm_mon + 1);
    stamp[2] = static_cast<int16_t>(tm.tm_mday);
    stamp[3] = static_cast<int16_t>(tm.tm_hour);
    stamp[4] = static_cast<int16_t>(tm.tm_min);
    stamp[5] = static_cast<int16_t>(tm.tm_sec);
}

char* newText(const std::string& text) {
    char* copy = rcfAllocationFails() ? nullptr : new (std::nothrow) char[text.size() + 1];
    if (copy != nullptr) std::memcpy(copy, text.c_str(), text.size() + 1);
    return copy;
}

// The full path; the name as given when that fails.
char* fullPath(const char* path) { return newText(platform::fullPath(path)); }

// ---- Handler table of this layer ----------------------------------------

constexpr int kHandlerSlots = 21;
std::array<std::atomic<rcfErrorHandler>, kHandlerSlots> g_handlers{};

int handlerSlot(int32_t code) {
    if (code == 1000) return 0;
    if (code >= 2000 && code <= 2019) return code - 2000 + 1;
    return -1;
}

// ---- Look-ahead ----------------------------------------------------------

void resetPeek(RcfFile* h) {
    h->peekIndex = -1;
    h->peekCount = 0;
}

// Header bytes read from the stream but not yet handed to a caller.
uint32_t unconsumed(const RcfFile* h) {
    uint32_t sum = 0;
    for (int i = h->peekIndex + 1; i < h->peekCount; ++i) sum += h->peekHdr[i];
    return sum;
}

void appendPeek(RcfFile* h, int32_t type, uint32_t count, uint32_t length) {
    if (h->peekCount >= kPeekSlots) {
        // Every cached header has been handed out (a new one is read only
        // then); keep the newest so that one unpeek still finds it.
        const int last = h->peekCount - 1;
        h->peekType[0] = h->peekType[last];
        h->peekLen[0] = h->peekLen[last];
        h->peekHdr[0] = h->peekHdr[last];
        h->peekCount = 1;
    }
    const int i = h->peekCount;
    h->peekType[i] = static_cast<uint32_t>(type);
    h->peekLen[i] = count;
    h->peekHdr[i] = length;
    h->peekCount = static_cast<int16_t>(i + 1);
    h->peekIndex = static_cast<int16_t>(i);
}

// ---- Positioning ---------------------------------------------------------

int originToWhence(int32_t origin) {
    switch (origin) {
    case 0: return SEEK_SET;
    case 1: return SEEK_CUR;
    case 2: return SEEK_END;
    default: return -1;
    }
}

// The positioning rule shared by rcfSeek, rcfSeek64 and the internal moves.
void seekTo(RcfFile* h, int64_t offset, int32_t origin) {
    if (h->error == F_EOF) h->error = 0;
    if (h->error != 0) return;
    resetPeek(h);
    const int whence = originToWhence(origin);
    if (whence < 0 || streamSeek(h->stream, offset, whence) != 0) RCF_FAIL(h, F_ERR_SEEK);
    h->lastOp = 0;
}

// Short forward skips after a read go through the scratch buffer, keeping
// the stream's own buffer; anything else is a relative seek.
bool skipsByReading(const RcfFile* h, int64_t n) {
    return h->lastOp >= 0 && n >= 1 && n < static_cast<int64_t>(sizeof(h->scratch));
}

void skipBytes(RcfFile* h, int64_t n) {
    if (h->error == F_EOF) h->error = 0;
    if (h->error != 0) return;
    resetPeek(h);
    if (skipsByReading(h, n)) {
        const auto want = static_cast<size_t>(n);
        if (streamRead(h->scratch, want, h->stream) < want) RCF_FAIL(h, F_ERR_SEEK);
        h->lastOp = 1;
    } else {
        if (streamSeek(h->stream, n, SEEK_CUR) != 0) RCF_FAIL(h, F_ERR_SEEK);
        h->lastOp = 0;
    }
}

// Whether bytes more can be read from the logical position. A record's
// count is checked against this before anything is allocated for it; the
// file's length is asked again only when the cached one is too short.
bool fitsInFile(RcfFile* h, uint64_t bytes) {
    const int64_t raw = streamTell(h->stream);
    if (raw < 0) return false;
    const int64_t here = raw - static_cast<int64_t>(unconsumed(h)) + h->pendingSkip;
    if (bytes > static_cast<uint64_t>(INT64_MAX - here)) return false;
    const int64_t need = here + static_cast<int64_t>(bytes);
    if (need <= h->knownSize) return true;
    if (h->lastOp < 0) std::fflush(h->stream);
    h->knownSize = std::max(h->knownSize, streamLength(h->stream));
    return need <= h->knownSize;
}

// Reads size bytes of a record header for the look-ahead (keepPeek), taking
// them byte by byte from the stream's buffer when nothing has to move first
// (a call of fread for each of the one to five header bytes would cost more
// than a small record itself). Same results and errors as rcfReadRaw.
bool readPeekBytes(RcfFile* h, void* out, uint32_t size) {
    if (h->lastOp < 0 || h->pendingSkip != 0) return rcfReadRaw(out, size, 1, h, 1) != 0;
    auto* p = static_cast<unsigned char*>(out);
    for (uint32_t i = 0; i < size; ++i) {
        const int c = streamGetc(h->stream);
        h->lastOp = 1;
        if (c == EOF) {
            if (std::feof(h->stream)) {
                h->error = F_EOF;
            } else {
                RCF_FAIL(h, F_ERR_READ);
            }
            return false;
        }
        p[i] = static_cast<unsigned char>(c);
    }
    if (h->swapBytes != 0) swapElements(out, size, 1);
    return true;
}

// ---- Writing -------------------------------------------------------------

// Checks that a write may happen and moves the stream to the logical
// position (abandoning cached headers, applying a deferred skip, and
// repositioning after a read as the C streams require).
bool beginWrite(RcfFile* h) {
    if (h->error != 0) return false;
    if (h->readOnly != 0) {
        RCF_FAIL(h, F_ERR_READONLY);
        return false;
    }
    int64_t d = -static_cast<int64_t>(unconsumed(h));
    resetPeek(h);
    d += h->pendingSkip;
    h->pendingSkip = 0;
    if ((h->lastOp > 0 || d != 0) && streamSeek(h->stream, d, SEEK_CUR) != 0) {
        RCF_FAIL(h, F_ERR_SEEK);
        return false;
    }
    return true;
}

void putBytes(RcfFile* h, const void* data, size_t n) {
    if (h->error != 0 || n == 0) return;
    if (streamWrite(data, n, h->stream) != n) RCF_FAIL(h, F_ERR_WRITE);
}

// Writes count elements; for a foreign-order file they are reversed in a
// copy, chunk by chunk, so the caller's (possibly const) buffer is left as
// it was.
void putElements(RcfFile* h, const void* data, uint32_t size, uint64_t count) {
    if (h->swapBytes == 0 || (size != 2 && size != 4 && size != 8)) {
        putBytes(h, data, static_cast<size_t>(size * count));
        return;
    }
    alignas(8) unsigned char chunk[8192];
    const uint64_t perChunk = sizeof(chunk) / size;
    const auto* src = static_cast<const unsigned char*>(data);
    for (uint64_t done = 0; done < count && h->error == 0;) {
        const uint64_t n = std::min(perChunk, count - done);
        std::memcpy(chunk, src + done * size, static_cast<size_t>(n * size));
        swapElements(chunk, size, n);
        putBytes(h, chunk, static_cast<size_t>(n * size));
        done += n;
    }
}

void writeElements(RcfFile* h, const void* data, uint32_t size, uint64_t count) {
    if (!beginWrite(h)) return;
    putElements(h, data, size, count);
    h->lastOp = -1;
}

// The 40 bytes of one stamp group: six 16-bit values and two versions.
void writeStampGroup(RcfFile* h, const int16_t stamp[6], uint32_t version, uint32_t appVersion) {
    writeElements(h, stamp, 2, 6);
    writeElements(h, &version, 4, 1);
    writeElements(h, &appVersion, 4, 1);
}

void readStampGroup(RcfFile* h, int16_t stamp[6], uint32_t* version, uint32_t* appVersion) {
    rcfReadRaw(stamp, 2, 6, h, 0);
    rcfReadRaw(version, 4, 1, h, 0);
    rcfReadRaw(appVersion, 4, 1, h, 0);
}

// ---- Opening -------------------------------------------------------------

using FilePtr = std::unique_ptr<RcfFile>;

FilePtr newFile() {
    FilePtr h(rcfAllocationFails() ? nullptr : new (std::nothrow) RcfFile());
    if (h) h->openClock = clockMs();
    return h;
}

bool openStream(RcfFile* h, const char* path, const char* mode) {
    h->stream = platform::streamOpen(path, mode);
    if (h->stream == nullptr) return false;
    // Only files being created ("wb", "wb+") write straight on; the others jump.
    const bool jumps = std::strcmp(mode, "rb") == 0 || std::strcmp(mode, "rb+") == 0;
    const size_t size = jumps ? kRcfReadBufferSize : kRcfStreamBufferSize;
    // Without a buffer of its own the stream keeps the C library's.
    h->ioBuffer.reset(rcfAllocationFails() ? nullptr : new (std::nothrow) char[size]);
    if (h->ioBuffer) std::setvbuf(h->stream, h->ioBuffer.get(), _IOFBF, size);
    return true;
}

// Finds the 0x1A that ends the text part of the header and leaves the
// stream just after it. End of file first sets error 1.
void skipBanner(RcfFile* h) {
    int64_t pos = streamTell(h->stream);
    for (;;) {
        const size_t got = std::fread(h->scratch, 1, sizeof(h->scratch), h->stream);
        h->lastOp = 1;
        if (got == 0) {
            if (std::feof(h->stream)) {
                h->error = F_EOF;
            } else {
                RCF_FAIL(h, F_ERR_READ);
            }
            return;
        }
        if (const void* hit = std::memchr(h->scratch, kEndOfText, got)) {
            pos += static_cast<const unsigned char*>(hit) - h->scratch + 1;
            seekTo(h, pos, 0);
            return;
        }
        pos += static_cast<int64_t>(got);
        // Offsets in the header are 32-bit: no record file has text this long.
        if (pos > static_cast<int64_t>(UINT32_MAX - kStampBlockBytes)) {
            RCF_FAIL(h, F_ERR_NOT_RCF);
            return;
        }
    }
}

int32_t openCreate(const char* path, const char* appText, FileHandle* out, rcfAppIdent appIdent, int32_t readBack) {
    if (out == nullptr) return RCF_REPORT(F_ERR_ARGUMENT);
    *out = nullptr;
    if (path == nullptr) return RCF_REPORT(F_ERR_OPEN);
    FilePtr h = newFile();
    if (!h) return RCF_REPORT(F_ERR_MEMORY);
    if (!openStream(h.get(), path, readBack != 0 ? "wb+" : "wb")) return RCF_REPORT(F_ERR_OPEN);

    uint32_t appTag = kNoAppTag;
    uint32_t appVersion = 0;
    if (appIdent != nullptr) appTag = appIdent(&appVersion);

    stampNow(h->createStamp);
    std::memcpy(h->editStamp, h->createStamp, sizeof(h->editStamp));
    h->filname = fullPath(path);
    if (h->filname == nullptr) return RCF_REPORT(F_ERR_MEMORY);
    h->versionCreate = h->versionEdit = kRcfVersionCurrent;
    h->versionCreateApp = h->versionEditApp = appVersion;

    // Text part: tag, application tag, banner, optional "  " + text, 0x1A.
    std::string text(kTag, sizeof(kTag));
    text.append(reinterpret_cast<const char*>(&appTag), sizeof(appTag));
    text.append(kBanner, sizeof(kBanner) - 1);
    if (appText != nullptr && appText[0] != '\0') {
        text += "  ";
        text += appText;
    }
    text += static_cast<char>(kEndOfText);
    writeElements(h.get(), text.data(), 1, text.size());
    h->rcfBase = static_cast<uint32_t>(streamTell(h->stream));

    writeStampGroup(h.get(), h->createStamp, h->versionCreate, h->versionCreateApp);
    writeStampGroup(h.get(), h->editStamp, h->versionEdit, h->versionEditApp);
    const uint32_t reserved[2] = {0, 0};
    writeElements(h.get(), reserved, 4, 2);
    h->appBase = static_cast<uint32_t>(streamTell(h->stream));

    if (h->error != 0) return h->error;
    *out = h.release();
    return F_NO_ERROR;
}

int32_t openCommon(const char* path, FileHandle* out, const char* mode, rcfAppIdent appIdent, uint32_t* appTagOut) {
    uint32_t appTagLocal = 0;
    if (appTagOut == nullptr) appTagOut = &appTagLocal;
    if (out == nullptr) return RCF_REPORT(F_ERR_ARGUMENT);
    *out = nullptr;
    *appTagOut = 0;
    if (appIdent == nullptr) return RCF_REPORT(F_ERR_ARGUMENT);
    if (path == nullptr || mode == nullptr) return RCF_REPORT(F_ERR_OPEN);
    FilePtr h = newFile();
    if (!h) return RCF_REPORT(F_ERR_MEMORY);
    if (!openStream(h.get(), path, mode)) return RCF_REPORT(F_ERR_OPEN);

    // A failed open leaves no stream behind: the object closes it.
    unsigned char tag[4];
    if (std::fread(tag, 1, sizeof(tag), h->stream) != sizeof(tag)) return RCF_REPORT(F_ERR_READ);
    h->lastOp = 1;
    const unsigned char reversed[4] = {tag[3], tag[2], tag[1], tag[0]};
    if (std::memcmp(tag, kTag, 4) == 0) {
        h->swapBytes = 0;
    } else if (std::memcmp(reversed, kTag, 4) == 0) {
        h->swapBytes = 1;
    } else {
        return RCF_REPORT(F_ERR_NOT_RCF);
    }
    h->filname = fullPath(path);
    if (h->filname == nullptr) return RCF_REPORT(F_ERR_MEMORY);

    uint32_t appTag = 0;
    if (rcfReadRaw(&appTag, 4, 1, h.get(), 0)) {
        *appTagOut = appTag;
        uint32_t version = 0;
        if (appTag != appIdent(&version)) {
            version = 0;
            if (appIdent(&version) != RCF_ACCEPT_ANY_APP) h->error = F_ERR_APP_TAG;  // not reported here
        }
    }
    if (h->error == 0) skipBanner(h.get());
    if (h->error == 0) {
        h->rcfBase = static_cast<uint32_t>(streamTell(h->stream));
        readStampGroup(h.get(), h->createStamp, &h->versionCreate, &h->versionCreateApp);
        readStampGroup(h.get(), h->editStamp, &h->versionEdit, &h->versionEditApp);
        uint32_t reserved[2];
        rcfReadRaw(reserved, 4, 2, h.get(), 0);
        h->appBase = static_cast<uint32_t>(streamTell(h->stream));
    }
    if (h->error != 0) return h->error;
    *out = h.release();
    return F_NO_ERROR;
}

int32_t openEdit(const char* path, FileHandle* out, rcfAppIdent appIdent, uint32_t* appTagOut) {
    const int32_t code = openCommon(path, out, "rb+", appIdent, appTagOut);
    if (code != 0) return code;
    RcfFile* h = *out;
    delete[] h->editTimeText;
    h->editTimeText = nullptr;
    stampNow(h->editStamp);
    uint32_t appVersion = 0;
    appIdent(&appVersion);
    // The object keeps the versions read from the file; only the disk changes.
    seekTo(h, static_cast<int64_t>(h->rcfBase) + 20, 0);
    writeStampGroup(h, h->editStamp, kRcfVersionCurrent, appVersion);
    rcfSeekAppBase(h);
    if (h->error != 0) {
        const int32_t error = h->error;
        rcfFileClose(out);
        return error;
    }
    return F_NO_ERROR;
}

// ---- Date and time texts -------------------------------------------------

const char* cachedText(char*& slot, bool date, const int16_t* values) {
    if (slot == nullptr) {
        char buffer[64];
        const int n = date ? std::snprintf(buffer, sizeof(buffer), "%.4d-%.2d-%.2d", values[0], values[1], values[2])
                           : std::snprintf(buffer, sizeof(buffer), "%.2d:%.2d:%.2d", values[0], values[1], values[2]);
        if (n < 0 || static_cast<size_t>(n) >= sizeof(buffer)) return "";
        slot = newText(buffer);
        if (slot == nullptr) return "";
    }
    return slot;
}

// ---- Logical records -----------------------------------------------------

uint64_t recordBytes64(int32_t type, uint32_t count) { return static_cast<uint64_t>(rcfSimpSize(type)) * count; }

}  // namespace

// ---- Internal interface ----------------------------------------------------

RcfFile::~RcfFile() {
    if (stream != nullptr) std::fclose(stream);
    delete[] filname;
    delete[] createDateText;
    delete[] createTimeText;
    delete[] editDateText;
    delete[] editTimeText;
}

rcfErrorHandler rcfSetErrorHandler(int32_t code, rcfErrorHandler handler) {
    const int slot = handlerSlot(code);
    if (slot < 0) return nullptr;
    return g_handlers[static_cast<size_t>(slot)].exchange(handler, std::memory_order_acq_rel);
}

int32_t rcfReportError(int32_t code, const char* module, int32_t line) {
    const int slot = handlerSlot(code);
    if (slot < 0) return code;
    const rcfErrorHandler handler = g_handlers[static_cast<size_t>(slot)].load(std::memory_order_acquire);
    if (handler != nullptr) handler(code, module, line);
    return code;
}

int32_t rcfFileOpenCreate(const char* path, const char* appText, FileHandle* out, rcfAppIdent appIdent,
                          int32_t readBack) {
    return tova::guarded([&] { return openCreate(path, appText, out, appIdent, readBack); });
}

int32_t rcfFileOpen(const char* path, FileHandle* out, const char* mode, rcfAppIdent appIdent, uint32_t* appTagOut) {
    return tova::guarded([&] { return openCommon(path, out, mode, appIdent, appTagOut); });
}

int32_t rcfFileOpenEdit(const char* path, FileHandle* out, rcfAppIdent appIdent, uint32_t* appTagOut) {
    return tova::guarded([&] { return openEdit(path, out, appIdent, appTagOut); });
}

uint32_t rcfClockMs() { return clockMs(); }

namespace {
// Countdown of the allocation test hook; 0 when disarmed (the usual case: one
// relaxed load per allocation, safe while threads allocate).
std::atomic<int32_t> g_failAllocation{0};
}  // namespace

bool rcfAllocationFails() noexcept {
    if (g_failAllocation.load(std::memory_order_relaxed) <= 0) return false;
    return g_failAllocation.fetch_sub(1, std::memory_order_relaxed) == 1;
}

int32_t rcfTestFailAllocation(int32_t nth) noexcept {
    return g_failAllocation.exchange(nth > 0 ? nth : 0, std::memory_order_relaxed);
}

bool rcfFits(FileHandle h, uint64_t bytes) { return h != nullptr && fitsInFile(h, bytes); }

void rcfSeekAppBase(FileHandle h) {
    if (h != nullptr) seekTo(h, h->appBase, 0);
}

int32_t rcfReadRaw(void* buffer, uint32_t elementSize, uint32_t count, FileHandle h, int32_t keepPeek) {
    if (h == nullptr || h->error != 0) return 0;
    int64_t d = 0;
    if (keepPeek == 0) {
        d = -static_cast<int64_t>(unconsumed(h));
        resetPeek(h);
    }
    d += h->pendingSkip;
    h->pendingSkip = 0;
    if (h->lastOp < 0) {
        // A read after a write needs a positioning call, even a null one.
        if (streamSeek(h->stream, d, SEEK_CUR) != 0) {
            RCF_FAIL(h, F_ERR_SEEK);
            return 0;
        }
    } else if (d != 0) {
        skipBytes(h, d);
        if (h->error != 0) return 0;
    }
    const uint64_t bytes = static_cast<uint64_t>(elementSize) * count;
    if (bytes > SIZE_MAX) {
        RCF_FAIL(h, F_ERR_READ);
        return 0;
    }
    const size_t got = bytes != 0 ? streamRead(buffer, static_cast<size_t>(bytes), h->stream) : 0;
    h->lastOp = 1;
    if (got < bytes) {
        if (std::feof(h->stream)) {
            h->error = F_EOF;  // end of file is a state, not a failure: never reported
        } else {
            RCF_FAIL(h, F_ERR_READ);
        }
        return 0;
    }
    if (h->swapBytes != 0) swapElements(buffer, elementSize, count);
    return 1;
}

void rcfWriteRaw(void* buffer, uint32_t elementSize, uint32_t count, FileHandle h) {
    if (h != nullptr) writeElements(h, buffer, elementSize, count);
}

int32_t rcfPeekHeader(FileHandle h, uint32_t* count, uint32_t* headerLength) {
    uint32_t countLocal = 0;
    uint32_t lengthLocal = 0;
    if (count == nullptr) count = &countLocal;
    if (headerLength == nullptr) headerLength = &lengthLocal;
    if (h == nullptr) return 0;
    if (h->peekIndex + 1 < h->peekCount) {
        const int i = ++h->peekIndex;
        *count = h->peekLen[i];
        *headerLength = h->peekHdr[i];
        return static_cast<int32_t>(h->peekType[i]);
    }
    int32_t type = 0;
    uint32_t entryCount = *count;  // a terminator leaves the caller's count as it was
    uint32_t entryLength = 0;
    if (h->error == 0) {
        unsigned char mark = 0;
        if (readPeekBytes(h, &mark, 1)) {
            type = static_cast<int8_t>(mark);
            entryLength = 1;
            if (type > 0) {
                uint32_t n = 0;
                if (readPeekBytes(h, &n, 4)) entryCount = n;
                entryLength = 5;
            } else if (mark == kBlockStart) {
                uint16_t id = 0;
                if (readPeekBytes(h, &id, 2)) entryCount = id;
                entryLength = 3;
            }
        }
        if (h->error != 0) {
            type = 0;
            entryCount = 0;
            entryLength = 0;
        }
        *count = entryCount;
        *headerLength = entryLength;
    }
    appendPeek(h, type, entryCount, entryLength);
    return type;
}

void rcfUnpeekHeader(FileHandle h) {
    // Never below -1: an unpeek with nothing handed out changes nothing.
    if (h != nullptr && h->peekIndex > -1) --h->peekIndex;
}

void rcfSkipBytes(FileHandle h, int32_t n) {
    if (h != nullptr) skipBytes(h, n);
}

void rcfSeek(FileHandle h, int32_t offset, int32_t origin) {
    if (h != nullptr) seekTo(h, offset, origin);
}

void rcfSkipDeferred(FileHandle h, uint32_t n) { rcfSkipDeferred64(h, n); }

void rcfSkipDeferred64(FileHandle h, uint64_t n) {
    if (h == nullptr) return;
    if (h->error == F_EOF) h->error = 0;
    if (h->error != 0) return;
    n = std::min<uint64_t>(n, static_cast<uint64_t>(INT64_MAX) / 2);
    const int64_t total = static_cast<int64_t>(h->pendingSkip) + static_cast<int64_t>(n);
    if (total <= INT32_MAX) {
        h->pendingSkip = static_cast<int32_t>(total);
        return;
    }
    // Too far to keep pending: move now, from the logical position.
    h->pendingSkip = 0;
    const int64_t d = total - static_cast<int64_t>(unconsumed(h));
    resetPeek(h);
    seekTo(h, d, 1);
}

uint32_t rcfRecordBytes(int32_t type, uint32_t count) {
    const uint64_t bytes = recordBytes64(type, count);
    if (bytes == 0 || bytes > UINT32_MAX) {
        RCF_REPORT(F_ERR_TYPE);
        return 0;
    }
    return static_cast<uint32_t>(bytes);
}

// ---- Exported interface ----------------------------------------------------

extern "C" {

int32_t TOVA_CALL rcfFileOpenRead(const char* path, FileHandle* out, rcfAppIdent appIdent, uint32_t* appTagOut) {
    const int32_t code = rcfFileOpen(path, out, "rb", appIdent, appTagOut);
    if (code == 0) (*out)->readOnly = 1;
    return code;
}

int32_t TOVA_CALL rcfFileClose(FileHandle* handle) {
    if (handle == nullptr || *handle == nullptr) return F_NO_ERROR;
    FilePtr h(*handle);
    *handle = nullptr;
    int32_t code = F_NO_ERROR;
    if (h->stream != nullptr) {
        if (std::fclose(h->stream) != 0) code = F_ERR_CLOSE;  // not reported
        h->stream = nullptr;
    }
    return code;  // the stream buffer is freed with the object, after the close
}

int32_t TOVA_CALL rcfGetError(FileHandle h) {
    if (h == nullptr) return F_ERR_ARGUMENT;
    const int32_t error = h->error;
    h->error = 0;
    return error;
}

int32_t TOVA_CALL rcfPeekError(FileHandle h) { return h != nullptr ? h->error : F_ERR_ARGUMENT; }

uint32_t TOVA_CALL rcfGetRCFbase(FileHandle h) { return h != nullptr ? h->rcfBase : 0; }
uint32_t TOVA_CALL rcfGetAppBase(FileHandle h) { return h != nullptr ? h->appBase : 0; }
const char* TOVA_CALL rcfGetFilename(FileHandle h) { return h != nullptr && h->filname != nullptr ? h->filname : ""; }
uint32_t TOVA_CALL rcfGetVersionCreate(FileHandle h) { return h != nullptr ? h->versionCreate : 0; }
uint32_t TOVA_CALL rcfGetVersionEdit(FileHandle h) { return h != nullptr ? h->versionEdit : 0; }
uint32_t TOVA_CALL rcfGetVersionCreateApp(FileHandle h) { return h != nullptr ? h->versionCreateApp : 0; }
uint32_t TOVA_CALL rcfGetVersionEditApp(FileHandle h) { return h != nullptr ? h->versionEditApp : 0; }
uint32_t TOVA_CALL rcfGetVersionCurrent(void) { return kRcfVersionCurrent; }

const char* TOVA_CALL rcfGetFileCreationDate(FileHandle h) {
    return h != nullptr ? cachedText(h->createDateText, true, &h->createStamp[0]) : "";
}
const char* TOVA_CALL rcfGetFileCreationTime(FileHandle h) {
    return h != nullptr ? cachedText(h->createTimeText, false, &h->createStamp[3]) : "";
}
const char* TOVA_CALL rcfGetFileEditDate(FileHandle h) {
    return h != nullptr ? cachedText(h->editDateText, true, &h->editStamp[0]) : "";
}
const char* TOVA_CALL rcfGetFileEditTime(FileHandle h) {
    return h != nullptr ? cachedText(h->editTimeText, false, &h->editStamp[3]) : "";
}

const char* TOVA_CALL rcfSimpName(int32_t code) {
    static constexpr const char* kNames[] = {"block",  "terminator", "unknown",   "float",     "double",
                                             "byte",   "integer*4",  "unsigned*4", "integer*2", "unsigned*2"};
    return code >= RCF_BLOCK && code <= RCF_UINT2 ? kNames[code - RCF_BLOCK] : "unknown";
}

uint16_t TOVA_CALL rcfSimpSize(int32_t code) {
    switch (code) {
    case RCF_FLOAT: return 4;
    case RCF_DOUBLE: return 8;
    case RCF_BYTE: return 1;
    case RCF_INT4: return 4;
    case RCF_UINT4: return 4;
    case RCF_INT2: return 2;
    case RCF_UINT2: return 2;
    default: return 0;
    }
}

// 0 is accepted on purpose: callers that need a data type test for > 0.
int32_t TOVA_CALL rcfSimpValid(int32_t code) { return code >= RCF_BLOCK && code <= RCF_UINT2 ? 1 : 0; }

int32_t TOVA_CALL rcfLrecWrite(FileHandle h, int32_t type, uint32_t count, const void* data) {
    if (h == nullptr) return RCF_REPORT(F_ERR_ARGUMENT);
    if (h->error != 0) return h->error;
    if (rcfRecordBytes(type, count) == 0) {
        // A zero-size record is not written and is no failure of the file;
        // one too large for the format is refused.
        if (recordBytes64(type, count) != 0) h->error = F_ERR_TYPE;
        return h->error;
    }
    if (data == nullptr) return RCF_FAIL(h, F_ERR_ARGUMENT);
    if (!beginWrite(h)) return h->error;
    unsigned char record[5 + kSmallRecordBytes];
    record[0] = static_cast<unsigned char>(static_cast<int8_t>(type));
    const uint32_t diskCount = h->swapBytes != 0 ? bswap(count) : count;
    std::memcpy(record + 1, &diskCount, 4);
    const uint64_t bytes = recordBytes64(type, count);
    if (h->swapBytes == 0 && bytes <= kSmallRecordBytes) {
        // A small record goes to the stream in one call, header and elements.
        std::memcpy(record + 5, data, static_cast<size_t>(bytes));
        putBytes(h, record, static_cast<size_t>(5 + bytes));
    } else {
        putBytes(h, record, 5);
        putElements(h, data, rcfSimpSize(type), count);
    }
    h->lastOp = -1;
    return h->error;
}

uint32_t TOVA_CALL rcfLrecRead(FileHandle h, int32_t type, uint32_t maxCount, void* buffer) {
    if (h == nullptr) return 0;
    uint32_t count = 0;
    uint32_t length = 0;
    const int32_t t = rcfPeekHeader(h, &count, &length);
    if (t >= 1) {
        const uint64_t bytes = recordBytes64(t, count);
        if (bytes > UINT32_MAX) {
            RCF_FAIL(h, F_ERR_READ);
            return 0;
        }
        if (rcfRecordBytes(t, count) == 0) return 0;
        if (t != type) {
            RCF_FAIL(h, F_ERR_TYPE);  // the header stays consumed
            return 0;
        }
        if (maxCount < count) {
            RCF_FAIL(h, F_ERR_SIZE);
            return 0;
        }
        if (buffer == nullptr) {
            RCF_FAIL(h, F_ERR_ARGUMENT);
            return 0;
        }
        // A small record is read without asking for the file's length: one
        // cut short meets the end of the file, a read failure all the same.
        if (bytes > kSmallRecordBytes && !fitsInFile(h, bytes)) {
            RCF_FAIL(h, F_ERR_READ);
            return 0;
        }
        if (rcfReadRaw(buffer, rcfSimpSize(t), count, h, 0)) return count;
        if (h->error == F_EOF) RCF_FAIL(h, F_ERR_READ);
        return 0;
    }
    if (t < 0) {
        rcfUnpeekHeader(h);
        RCF_FAIL(h, F_ERR_SKIP);
    }
    return 0;
}

void* TOVA_CALL rcfLrecReadAlloc(FileHandle h, int32_t* type, uint32_t* count) {
    int32_t typeLocal = 0;
    uint32_t countLocal = 0;
    if (type == nullptr) type = &typeLocal;
    if (count == nullptr) count = &countLocal;
    *type = 0;
    if (h == nullptr) return nullptr;
    uint32_t length = 0;
    const int32_t t = rcfPeekHeader(h, count, &length);
    *type = t;
    if (t >= 1) {
        // The count is checked against the file before anything is allocated.
        const uint64_t bytes = recordBytes64(t, *count);
        if (bytes > UINT32_MAX) {
            RCF_FAIL(h, F_ERR_READ);
            return nullptr;
        }
        if (rcfRecordBytes(t, *count) == 0) return nullptr;
        if (!fitsInFile(h, bytes)) {
            RCF_FAIL(h, F_ERR_READ);
            return nullptr;
        }
        void* buffer = rcfAllocationFails() ? nullptr : std::malloc(static_cast<size_t>(bytes));
        if (buffer == nullptr) {
            RCF_FAIL(h, F_ERR_MEMORY);
            return nullptr;
        }
        if (!rcfReadRaw(buffer, rcfSimpSize(t), *count, h, 0)) {
            std::free(buffer);
            return nullptr;
        }
        return buffer;
    }
    if (h->inBlock != 0) {
        if (t == RCF_TERMINATOR) {
            h->inBlock = 0;
            resetPeek(h);  // the terminator is consumed
        }
        return nullptr;
    }
    if (t < 0) rcfUnpeekHeader(h);  // the block mark stays for the next caller
    return nullptr;
}

void TOVA_CALL rcfLrecFree(void** buffer) {
    if (buffer == nullptr) return;
    std::free(*buffer);
    *buffer = nullptr;
}

int32_t TOVA_CALL rcfQuery(FileHandle h, uint32_t* count) {
    if (h == nullptr) return 0;
    uint32_t countLocal = 0;
    if (count == nullptr) count = &countLocal;
    uint32_t length = 0;
    const int32_t type = rcfPeekHeader(h, count, &length);
    if (type != 0) rcfUnpeekHeader(h);
    return type;
}

int32_t TOVA_CALL rcfSkip(FileHandle h) {
    if (h == nullptr || h->error != 0) return 0;
    uint32_t count = 0;
    const int32_t t = rcfQuery(h, &count);
    int64_t n = 0;
    if (t >= 1) {
        n = static_cast<int64_t>(recordBytes64(t, count)) + 5;
        // A skip by seeking is checked against the file's length first: over
        // a record that runs past the end it would leave the stream far
        // beyond the end, where a write makes a file of the size a damaged
        // count claims. The skip stops at the end instead and fails, as a
        // short skip (which reads) does.
        if (!skipsByReading(h, n - unconsumed(h)) && !fitsInFile(h, static_cast<uint64_t>(n))) {
            h->pendingSkip = 0;
            resetPeek(h);
            streamSeek(h->stream, 0, SEEK_END);
            h->lastOp = 0;
            RCF_FAIL(h, F_ERR_SEEK);
            return t;
        }
    } else if (t == RCF_BLOCK) {
        n = 3;
    } else if (t < 0) {
        n = 1;  // terminator, or an unknown mark passed over so that skip loops advance
    }
    n -= unconsumed(h);
    resetPeek(h);
    if (n != 0) skipBytes(h, n);
    return t;
}

void TOVA_CALL rcfSeek64(FileHandle h, uint32_t offsetLow, uint32_t offsetHigh, int32_t origin) {
    if (h == nullptr) return;
    const auto offset = static_cast<int64_t>((static_cast<uint64_t>(offsetHigh) << 32) | offsetLow);
    seekTo(h, offset, origin);
}

int64_t TOVA_CALL rcfTell64(FileHandle h) {
    if (h == nullptr) return -1;
    int64_t d = h->pendingSkip;
    h->pendingSkip = 0;
    d -= unconsumed(h);
    resetPeek(h);
    if (d != 0) seekTo(h, d, 1);
    return streamTell(h->stream);
}

int32_t TOVA_CALL rcfTell(FileHandle h) {
    return h != nullptr ? static_cast<int32_t>(streamTell(h->stream)) : -1;
}

}  // extern "C"
