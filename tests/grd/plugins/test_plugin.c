/*
 * Test plug-in, built in several variants (see CMakeLists.txt). The recorder
 * offers the file's items plus one derived float item on an EqD1 axis of two
 * elements: twice the first value of the file's item 1, and the time of the
 * time step. It keeps one session (one header at a time) and records the
 * calls it gets in a log that the tests read through testPluginLog:
 *   I initialise, T terminate, N<n> new time step (n: the item count the
 *   header shows meanwhile), R<k> read of item k, S<k> the same without a
 *   buffer, E<status> a failed read of the file.
 * The other variants each break one rule: no grdExtNewTimeStep, an axis type
 * out of range for the derived item, an initialisation that fails.
 */
#include <stdarg.h>
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include "tova/grdext.h"

GRD_EXT_EXPORT const char* testPluginLog(void);
GRD_EXT_EXPORT void testPluginClearLog(void);

static char logText[4096];
static size_t logLength = 0;

const char* testPluginLog(void) { return logText; }

void testPluginClearLog(void) {
    logLength = 0;
    logText[0] = '\0';
}

static void record(const char* format, ...) {
    va_list args;
    int n;
    if (logLength + 1 >= sizeof logText) return;
    va_start(args, format);
    n = vsnprintf(logText + logLength, sizeof logText - logLength, format, args);
    va_end(args);
    if (n > 0) logLength += (size_t)n < sizeof logText - logLength ? (size_t)n : sizeof logText - logLength - 1;
}

/* One session: the file's item count, one time step of its items, the
 * derived values. */
static int32_t fileItems = 0;
static void* values[16];
static float derived[2];

static void freeValues(void) {
    int32_t k;
    for (k = 0; k < 16; ++k) {
        free(values[k]);
        values[k] = NULL;
    }
}

GRD_EXT_EXPORT int TOVA_CALL grdExtInitialize(HeaderHandle header, FileHandle file) {
    int32_t k;
    (void)file;
    record("I");
#ifdef TEST_PLUGIN_INIT_FAILS
    (void)header;
    (void)k;
    return 7;
#else
    fileItems = grdGetNoOfItems(header);
    if (fileItems < 1 || fileItems > 16) return 1;
    for (k = 1; k <= fileItems; ++k) {
        const int32_t bytes = grdGetItemBytes(grdItemD(header, k));
        values[k - 1] = bytes > 0 ? calloc(1, (size_t)bytes) : NULL;
        if (values[k - 1] == NULL) {
            freeValues();
            return 2;
        }
    }
    return 0;
#endif
}

GRD_EXT_EXPORT int TOVA_CALL grdExtTerminate(HeaderHandle header) {
    (void)header;
    record("T");
    freeValues();
    return 5;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetNoOfItems(HeaderHandle header) {
    (void)header;
    return fileItems + 1;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtIsItemDerived(HeaderHandle header, int32_t itemNo) {
    (void)header;
    return itemNo > fileItems;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemInfo(HeaderHandle header, int32_t itemNo, int32_t* itemType,
                                               const char** name, int32_t* unit, const char** unitName,
                                               int32_t* dataType, const char** otherName) {
    (void)header;
    (void)otherName;
    if (itemNo <= fileItems) return 0; /* as copied */
    *itemType = 999;
    *name = "Derived";
    *unit = 0;
    *unitName = "units";
    *dataType = 1;
    return 0;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemValueType(HeaderHandle header, int32_t itemNo) {
    (void)header;
    return itemNo > fileItems ? 2 : -1;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemStatsGlobal(HeaderHandle header, int32_t itemNo, double* minimum,
                                                      double* maximum, int32_t* deleteCount) {
    (void)header;
    if (itemNo <= fileItems) return 1; /* keep the copy's */
    *minimum = -1.5;
    *maximum = 7.25;
    *deleteCount = 3;
    return 0;
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemAxisType(HeaderHandle header, int32_t itemNo) {
    (void)header;
    if (itemNo <= fileItems) return -1;
#ifdef TEST_PLUGIN_AXIS_OUT_OF_RANGE
    return 4;
#else
    return 1;
#endif
}

GRD_EXT_EXPORT int TOVA_CALL grdExtGetItemAxisEq(HeaderHandle header, int32_t itemNo, int32_t* unit,
                                                 int32_t sizes[3], float starts[3], float steps[3]) {
    (void)header;
    if (itemNo <= fileItems) return 1;
    *unit = 20100; /* m */
    sizes[0] = 2;
    starts[0] = 10.0f;
    steps[0] = 0.5f;
    return 0;
}

#ifndef TEST_PLUGIN_NO_NEW_TIME_STEP
/* Reads the file's items of the time step in order, while the header shows
 * the file as it is. */
GRD_EXT_EXPORT int TOVA_CALL grdExtNewTimeStep(HeaderHandle header, FileHandle file) {
    int32_t k;
    double time = -1.0;
    record("N%d", (int)grdGetNoOfItems(header));
    for (k = 1; k <= fileItems; ++k) {
        const int32_t status = grdReadItemTimeStep(header, file, &time, values[k - 1]);
        if (status != 0) {
            record("E%d", (int)status);
            return status;
        }
    }
    derived[0] = 2.0f * ((const float*)values[0])[0];
    derived[1] = (float)time;
    return 0;
}
#endif

GRD_EXT_EXPORT int TOVA_CALL grdExtReadItemTimeStep(HeaderHandle header, FileHandle file, void* data) {
    int32_t itemNo = 0;
    (void)file;
    grdGetItemCursor(header, &itemNo, NULL);
    record(data != NULL ? "R%d" : "S%d", (int)itemNo);
    if (data == NULL) return 0;
    if (itemNo > fileItems) {
        memcpy(data, derived, sizeof derived);
    } else {
        memcpy(data, values[itemNo - 1], (size_t)grdGetItemBytes(grdItemD(header, itemNo)));
    }
    return 0;
}
