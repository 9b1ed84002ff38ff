/*
 * tova — the gridded data-file API: the header model (file attributes,
 * items, item axes, time axes), the file lifecycle, static and dynamic data,
 * positioning, statistics and extension plug-ins, plus the error-handler table
 * and the API trace switch.
 */
#ifndef TOVA_GRD_H
#define TOVA_GRD_H

#include "rcf.h"
#include "status.h"

TOVA_EXTERN_C_BEGIN

/* ---- Error handlers and tracing ------------------------------------------ */

/* Stores handler in the slot of code (1000, 2000-2019) and returns the handler
 * value. For 2020 and any other code nothing is stored and the result is
 * code - 2001 above 2000, else code. The result is pointer-sized so that the
 * handler value survives on 64-bit platforms. */
TOVA_API intptr_t TOVA_CALL grdAddErrorHandler(int32_t code, grdErrorHandler handler);
/* Clears every handler slot; the argument is not stored. Returns non-zero. */
TOVA_API intptr_t TOVA_CALL grdAddCommonErrorHandler(grdErrorHandler handler);
/* Clears every handler slot. */
TOVA_API void TOVA_CALL grdInitSystem(void);
/* Sets the API trace flag to flag as given; returns flag. */
TOVA_API int32_t TOVA_CALL grdDebugOn(int32_t flag);

TOVA_EXTERN_C_END

#endif /* TOVA_GRD_H */
