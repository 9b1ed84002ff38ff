// Record-file layer, internal interface: the object behind a FileHandle and
// the operations that the file-open layer, the cross-section and the VRE code
// use beneath the exported rcf API.
#pragma once

#include <cstdint>
#include <cstdio>
#include <memory>

#include "tova/rcf.h"

// One open record file. Zero-initialised on creation, freed only by rcfFileClose.
struct RcfFile {
    std::FILE* stream = nullptr;
    uint32_t openClock = 0;  // monotonic milliseconds when the object was made
    uint32_t swapBytes = 0;  // 1: file is in the opposite byte order
    char* filname = nullptr; // full path, owned
    int16_t createStamp[6] = {};
    char* createDateText = nullptr;
    char* createTimeText = nullptr;
    int16_t editStamp[6] = {};
    char* editDateText = nullptr;
    char* editTimeText = nullptr;
    uint32_t readOnly = 0;
    int32_t error = 0;  // sticky: 0 none, 1 end of file, else a status code
    uint32_t rcfBase = 0;
    uint32_t appBase = 0;
    uint32_t versionCreate = 0;
    uint32_t versionEdit = 0;
    uint32_t versionCreateApp = 0;
    uint32_t versionEditApp = 0;
    uint32_t inBlock = 0;
    int32_t lastOp = 0;       // 1 read, -1 write, 0 just positioned
    int32_t pendingSkip = 0;  // bytes to skip before the next transfer
    uint32_t ownerMark = 0;   // set by the logical-block layer's opens
    float deleteValFloat = 0.0f;
    double deleteValDouble = 0.0;
    int16_t peekCount = 0;
    int16_t peekIndex = -1;
    uint32_t peekType[4] = {};
    uint32_t peekLen[4] = {};
    uint32_t peekHdr[4] = {};
    unsigned char scratch[4096] = {};

    // Beyond the on-disk model: the stream's buffer (installed with setvbuf,
    // freed only after the stream is closed) and the largest file length
    // seen so far, refreshed on demand to bound what a record may claim.
    std::unique_ptr<char[]> ioBuffer;
    int64_t knownSize = 0;
    // For the gridded-data layer: the offset just after the block that starts
    // the dynamic data, once it has been written or found (-1 before), and
    // the measured byte length of one time step (0 before). The start never
    // moves while the file is open, so positioning can go there at once.
    int64_t dynamicStart = -1;
    int64_t timeStepLength = 0;
    // The offset where the header stream ends (-1 before it was written or
    // read): how much an in-place header update reads at once.
    int64_t headerEnd = -1;
    // For the gridded-data layer: the serial number of the header that the
    // file was created with or read into (0: none yet). Data calls with any
    // other header are refused, so that one file never receives the layout
    // of another.
    uint64_t headerSerial = 0;

    RcfFile() = default;
    RcfFile(const RcfFile&) = delete;
    RcfFile& operator=(const RcfFile&) = delete;
    // Closes a stream still open and frees the owned texts.
    ~RcfFile();
};

constexpr uint32_t kRcfVersionCurrent = 104;
constexpr size_t kRcfStreamBufferSize = 256 * 1024;
// Files opened for reading, or for editing, get a smaller buffer: every
// jump to a far position refills the whole buffer, and readers and editors
// are the ones that jump. 4 KiB, the C library's own size: a positioned
// read then costs about what a raw seek and read of the same bytes cost,
// and small records still cost one system call per hundreds of them
// (records of the buffer's size and more bypass it). An in-place header
// update reads the header stream in one transfer of its own.
constexpr size_t kRcfReadBufferSize = 4 * 1024;

// Handler form of this layer's own table (slots for 1000 and 2000-2019).
using rcfErrorHandler = int32_t (*)(int32_t code, const char* module, int32_t line);
// Stores handler for code and returns the previous one; codes without a slot
// store nothing and return null. No part of the library installs handlers.
rcfErrorHandler rcfSetErrorHandler(int32_t code, rcfErrorHandler handler);

// Opens and creation, used by the file-open, cross-section and VRE code.
int32_t rcfFileOpenCreate(const char* path, const char* appText, FileHandle* out, rcfAppIdent appIdent,
                          int32_t readBack);
int32_t rcfFileOpenEdit(const char* path, FileHandle* out, rcfAppIdent appIdent, uint32_t* appTagOut);
int32_t rcfFileOpen(const char* path, FileHandle* out, const char* mode, rcfAppIdent appIdent,
                    uint32_t* appTagOut);
void rcfSeekAppBase(FileHandle h);
// Test hook shared by every allocation of the library (record layer and data
// layer): after rcfTestFailAllocation(n) the n-th allocation from then on
// fails (1 = the next); 0 disarms. Returns the countdown it replaces: 0 when
// the failure asked for before has happened (or none was asked for).
// rcfAllocationFails consumes one allocation and says whether it is to fail.
bool rcfAllocationFails() noexcept;
int32_t rcfTestFailAllocation(int32_t nth) noexcept;

// Monotonic milliseconds, the clock of openClock (flush throttles compare against it).
uint32_t rcfClockMs();
// This layer's own status reporter (module "rcf"); returns code.
int32_t rcfReportError(int32_t code, const char* module, int32_t line);

// Raw transfers (apply the byte-order rule).
int32_t rcfReadRaw(void* buffer, uint32_t elementSize, uint32_t count, FileHandle h, int32_t keepPeek);
void rcfWriteRaw(void* buffer, uint32_t elementSize, uint32_t count, FileHandle h);

// Whether bytes more can be read from the logical position: the check made
// before anything is allocated for what a file claims to hold.
bool rcfFits(FileHandle h, uint64_t bytes);

// Record-header look-ahead and positioning.
int32_t rcfPeekHeader(FileHandle h, uint32_t* count, uint32_t* headerLength);
void rcfUnpeekHeader(FileHandle h);
void rcfSkipBytes(FileHandle h, int32_t n);
void rcfSeek(FileHandle h, int32_t offset, int32_t origin);
void rcfSkipDeferred(FileHandle h, uint32_t n);
// As rcfSkipDeferred for a distance of any size (a move that does not fit the
// pending counter is applied at once).
void rcfSkipDeferred64(FileHandle h, uint64_t n);
uint32_t rcfRecordBytes(int32_t type, uint32_t count);

// In-memory record lists and whole logical blocks. Node data is allocated
// with malloc: a buffer taken with rcfLrecDetachData is freed with
// rcfLrecFree (or free).
struct LrecNode {
    int32_t type;
    uint32_t count;
    uint32_t ownsData;
    void* data;
    LrecNode* next;
};

LrecNode* rcfLrecNodeNew(int32_t type, uint32_t count, const void* data, int32_t copy, LrecNode* appendTo);
void rcfLrecListFree(LrecNode** list);
void* rcfLrecDetachData(LrecNode* node);
int32_t rcfBlockWrite(uint16_t identifier, FileHandle h, LrecNode* first);
uint16_t rcfBlockRead(FileHandle h, uint32_t* nodeCount, LrecNode** first);
int32_t rcfBlockSkip(FileHandle h);
