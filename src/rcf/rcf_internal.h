// Record-file layer, internal interface: the object behind a FileHandle and
// the operations that the file-open layer, the cross-section and the VRE code
// use beneath the exported rcf API.
#pragma once

#include <cstdint>
#include <cstdio>

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
};

constexpr uint32_t kRcfVersionCurrent = 104;

// Opens and creation, used by the file-open, cross-section and VRE code.
int32_t rcfFileOpenCreate(const char* path, const char* appText, FileHandle* out, rcfAppIdent appIdent,
                          int32_t readBack);
int32_t rcfFileOpenEdit(const char* path, FileHandle* out, rcfAppIdent appIdent, uint32_t* appTagOut);
int32_t rcfFileOpen(const char* path, FileHandle* out, const char* mode, rcfAppIdent appIdent,
                    uint32_t* appTagOut);
void rcfSeekAppBase(FileHandle h);
// This layer's own status reporter (module "rcf"); returns code.
int32_t rcfReportError(int32_t code, const char* module, int32_t line);

// Raw transfers (apply the byte-order rule).
int32_t rcfReadRaw(void* buffer, uint32_t elementSize, uint32_t count, FileHandle h, int32_t keepPeek);
void rcfWriteRaw(void* buffer, uint32_t elementSize, uint32_t count, FileHandle h);

// Record-header look-ahead and positioning.
int32_t rcfPeekHeader(FileHandle h, uint32_t* count, uint32_t* headerLength);
void rcfUnpeekHeader(FileHandle h);
void rcfSkipBytes(FileHandle h, int32_t n);
void rcfSeek(FileHandle h, int32_t offset, int32_t origin);
void rcfSkipDeferred(FileHandle h, uint32_t n);
uint32_t rcfRecordBytes(int32_t type, uint32_t count);

// In-memory record lists and whole logical blocks.
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
