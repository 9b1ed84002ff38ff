// File-open and logical-block layer of the gridded data files (module
// fileio): opens, closes and moves through record files for the grd code and
// turns every failure of the record layer into a report through the grd
// status dispatcher. Traces itself when file-I/O tracing is on.
#pragma once

#include <cstdint>

#include "rcf/rcf_internal.h"
#include "tova/grd.h"

// Application callback of gridded data files: tag "GRD_", version 206.
uint32_t grdAppIdent(uint32_t* version);
constexpr uint32_t kGrdAppVersion = 206;

// Moves the file to an absolute position (clears an end-of-file state).
inline void grdSeekTo(FileHandle file, int64_t offset) {
    const auto u = static_cast<uint64_t>(offset);
    rcfSeek64(file, static_cast<uint32_t>(u), static_cast<uint32_t>(u >> 32), 0);
}

// A record list read from the file, freed when it goes out of scope.
struct GrdRecordList {
    LrecNode* list = nullptr;
    GrdRecordList() = default;
    GrdRecordList(const GrdRecordList&) = delete;
    GrdRecordList& operator=(const GrdRecordList&) = delete;
    ~GrdRecordList() { rcfLrecListFree(&list); }
};

FileHandle FOpenFileCreate(const char* path, int32_t readBack);
FileHandle FOpenFileRead(const char* path, int32_t* status);
FileHandle FOpenFileEdit(const char* path, int32_t* status);
int32_t FCloseFile(FileHandle* file);

LrecNode* FCreateLogicalBlock(int32_t type, uint32_t count, const void* data);
int32_t FAppendToLogicalBlock(int32_t type, uint32_t count, const void* data, LrecNode* list);
int32_t FFreeLogicalBlock(LrecNode* list);
int32_t FQueryLogicalBlock(FileHandle file);
LrecNode* FReadLogicalBlock(FileHandle file);
int32_t FSkipLogicalBlock(FileHandle file);

// Checked record and block transfers: the seam between the gridded-data code
// and the record layer. Each performs the transfer, takes the record file's
// pending error, validates what arrived and reports a failure once through
// the dispatcher with the caller's module and line (and header, when given).
// Each traces its own name on entry and "[%d]" on exit when API tracing is on.

// A typed block in memory starts with its type and count (an LrecNode):
// 0, 2001 (null block), 2009 (type differs), 2013 (count differs; an
// expected count of 0 accepts any).
int32_t grdCheckTypeSize(HeaderHandle header, const LrecNode* block, int32_t type, uint32_t count,
                         const char* module, int32_t line);
// Checks the file, reads the next logical block into *block (null when the
// file check fails) and applies grdCheckTypeSize to its first record.
int32_t grdCheckReadTypeSize(HeaderHandle header, FileHandle file, int32_t type, uint32_t count, LrecNode** block,
                             const char* module, int32_t line);
// Reads the next logical block into *block (identifier into *identifier when
// given); returns the record file's pending error (1 at end of file).
int32_t grdCheckReadLB(HeaderHandle header, FileHandle file, LrecNode** block, uint16_t* identifier,
                       const char* module, int32_t line);
int32_t grdCheckWriteLB(HeaderHandle header, uint16_t identifier, LrecNode* block, FileHandle file,
                        const char* module, int32_t line);
int32_t grdCheckReadLR(HeaderHandle header, int32_t type, uint32_t count, void* buffer, FileHandle file,
                       const char* module, int32_t line);
int32_t grdCheckWriteLR(HeaderHandle header, int32_t type, uint32_t count, const void* buffer, FileHandle file,
                        const char* module, int32_t line);
// Skips one data record; a block mark or terminator gives 2019.
int32_t grdCheckSkipLR(HeaderHandle header, FileHandle file, const char* module, int32_t line);
// Moves forward over a record of known type and count without reading it.
int32_t grdCheckPseudoSkipLR(int32_t type, uint32_t count, FileHandle file);

// A header and its file from an open, released at the end of scope unless
// handed over to the caller.
struct GrdOpenedFile {
    HeaderHandle header = nullptr;
    FileHandle file = nullptr;
    GrdOpenedFile() = default;
    GrdOpenedFile(const GrdOpenedFile&) = delete;
    GrdOpenedFile& operator=(const GrdOpenedFile&) = delete;
    ~GrdOpenedFile() {
        if (header != nullptr) grdHeaderDestroy(&header);
        if (file != nullptr) FCloseFile(&file);
    }
    void handOver(HeaderHandle* outHeader, FileHandle* outFile) {
        *outHeader = header;
        *outFile = file;
        header = nullptr;
        file = nullptr;
    }
};
