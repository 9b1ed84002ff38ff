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
