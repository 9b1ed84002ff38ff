// Gridded data-file layer: the status dispatcher through which every failure
// of the grd API (and of the file-open layer) is reported once where it arises.
#pragma once

#include <cstdint>

#include "tova/grd.h"

// Calls the user handler registered for code (1000, 2000-2020), if any, with
// the failure's context, and returns code unchanged. Codes outside that set
// are returned at once.
int32_t grdReportError(HeaderHandle header, FileHandle file, int32_t extra, int32_t code, const char* module,
                       int32_t line);

// Handler slot of a status code, or -1 when the dispatcher has none for it.
int32_t grdHandlerSlot(int32_t code);
