// Gridded data-file layer, header persistence: the tag stream that stores a
// header, its items and its time axis as logical blocks after the record-file
// header, its reader, and the in-place updates that bring a header on disk up
// to date. Implemented in grdheader.cpp; used by the lifecycle, static-item
// and data modules.
#pragma once

#include <cstdint>

#include "grd/grdheader.h"
#include "tova/grd.h"

// Block tags of the data file.
enum : uint16_t {
    kTagHeaderStart = 10000,
    kTagTimeStart = 20000,
    kTagItemStart = 30000,
    kTagItemCount = 30001,
    kTagItemText = 30002,   // item record whose unit is a text
    kTagElemStats = 30003,
    kTagAssocStatic = 30004,
    kTagItem = 30005,       // item record with a unit key
    kTagValueType = 30006,
    kTagStaticStart = 40000,
    kTagStaticData = 40001,
    kTagDynamicStart = 50000,
    kTagTimeStep = 50001,
    kTagCustomBlock = 60000,
};

// Writes the whole header stream at the current position (the caller has
// positioned at appBase) and copies the float and double delete values into
// the record file. 0 or the first failure's code.
int32_t grdWriteHeader(HeaderHandle header, FileHandle file);
// Item record writer, shared with the static-item writer: 30005 or 30002,
// 30006 and the axis block. 2020 when the unit does not suit the item type,
// 2010 for an axis kind that has no tag.
int32_t grdWriteItemRecord(HeaderHandle header, GrdItem* item, FileHandle file);

// Reads a header stream from the current position; null with *status (when
// given) on failure, the partly read header destroyed.
HeaderHandle grdReadHeader(FileHandle file, int32_t* status);
// Item record reader, shared with the static-item reader: 30002/30005, an
// optional 30006 and the axis block (older axis tags too). 2018 when the next
// block is not an item record.
int32_t grdReadItemRecord(HeaderHandle header, GrdItem* item, FileHandle file);

// Flushes the file and rewrites its time-axis block in place; without force
// at most once a second.
int32_t grdUpdateHeaderTime(HeaderHandle header, int32_t force, FileHandle file);
// Rewrites the header blocks in place, byte for byte the size they have;
// without force at most once a second. The close operation forces it.
int32_t grdUpdateHeader(HeaderHandle header, int32_t force, FileHandle file);
