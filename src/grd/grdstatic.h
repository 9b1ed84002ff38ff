// Gridded data-file layer, static items: an item that carries its own value
// array, written after the header (block 40000 once, then per item its item
// record and one 40001 block of values) and read back in file order.
//
// Section state of a data file (RcfFile::ownerMark): 1 positioned after the
// header, 2 inside the static items, 3 inside the dynamic data.
#pragma once

#include <cstdint>

#include "grd/grdheader.h"
#include "tova/grd.h"

inline constexpr const char* kModGrdStatic = "..\\grd\\grdstatic";

enum : uint32_t { kSectionHeader = 1, kSectionStatic = 2, kSectionDynamic = 3 };

// A static item: an item record (isStatic = 1) with its values. Made by
// grdStaticCreate or grdStaticRead, freed by grdStaticDestroy.
struct GrdStaticItem : GrdItem {
    GrdArray<unsigned char> values;  // the values as stored (read from a file)
    int64_t valueBytes = 0;          // bytes in values
    GrdHeader* header = nullptr;     // link whose delete values are used; the first one stays
};

// The static item behind an item handle, or null for a null handle or an
// item of a header.
GrdStaticItem* grdAsStatic(ItemHandle item) noexcept;
