// Gridded data-file layer: what the dynamic-data path needs of a loaded
// extension plug-in (the loader is in grdplugin.cpp). While a plug-in is
// loaded and not itself being called, reads and skips go through it.
#pragma once

#include <cstdint>

#include "grd/grdheader.h"

// Whether reads and skips of this header go through its plug-in: one is
// loaded and the re-entrancy flag is clear (the plug-in's own reads go to
// the file).
inline bool grdPluginRoutes(const GrdHeader* header) noexcept {
    return header->extension.data != nullptr && header->extReentrant == 0;
}

// Lets the plug-in deliver the item under the cursor: at the first item of a
// time step grdExtNewTimeStep, then (if that succeeded) grdExtReadItemTimeStep
// into data. With read false (a skip) only grdExtNewTimeStep, and only at the
// first item. The cursor is left as it was (the caller advances it); the
// header's current time is what the plug-in's reads left. Returns the
// plug-in's status.
int32_t grdPluginDeliver(GrdHeader* header, FileHandle file, void* data, bool read);

// Records per time step in the file: the file's own item count while a
// plug-in replaced the item list (and after it was unloaded), else the
// header's item count.
inline int32_t grdFileItemCount(const GrdHeader* header) noexcept {
    return header->noOfFileItems > 0 ? header->noOfFileItems : header->noOfItems;
}
