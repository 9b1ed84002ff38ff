/*
 * Writes a model result file the way a model engine does: a header with two
 * items on a 2-D grid and a calendar time axis, the bed level as a static
 * item, then one time step after another, each item in order, and a close.
 *
 *   grd_write [file]        (default model_result.grd)
 */
#include <math.h>
#include <stdio.h>
#include <stdlib.h>

#include <qty/qty.h>
#include <tova/grd.h>

enum { NX = 40, NY = 30, STEPS = 24 };
static const double stepSeconds = 1800.0;

/* Every call returns a status: 0, or a code whose text says what failed. */
static int failed(int32_t status, const char* what) {
    if (status == F_NO_ERROR) return 0;
    fprintf(stderr, "grd_write: %s: %s\n", what, grdGetStatusText(status));
    return 1;
}

/* Quantity and unit keys come from the unit library by their text keys. */
static int32_t quantity(const char* key) {
    int32_t type = QTY_ITEM_UNDEFINED;
    if (!qtyGetItemTypeTag(key, &type)) fprintf(stderr, "grd_write: no quantity %s\n", key);
    return type;
}
static int32_t unit(const char* key) {
    int32_t u = QTY_UNIT_UNDEFINED;
    if (!qtyGetUnitTag(key, &u)) fprintf(stderr, "grd_write: no unit %s\n", key);
    return u;
}

int main(int argc, char** argv) {
    const char* path = argc > 1 ? argv[1] : "model_result.grd";
    const int32_t metre = unit("m"), metrePerSecond = unit("m/s");
    static float bed[NX * NY], level[NX * NY], speed[NX * NY];
    HeaderHandle header = NULL;
    FileHandle file = NULL;
    ItemHandle bedLevel = NULL;
    int32_t i, j, t, n;
    int rc = 1;

    /* 1. The header: file type, titles, the number of items, statistics. */
    if (failed(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "Harbour basin", "grd_write example", 1, 2,
                               F_ITEM_STATS_GLOBAL, &header), "creating the header"))
        return 1;

    /* 2. Items, their grid and the time axis: 24 half-hourly steps. */
    if (failed(grdSetItemInfo(header, grdItemD(header, 1), quantity("WaterLevel"), "Water level", metre, RCF_FLOAT),
               "item 1") ||
        failed(grdSetItemInfo(header, grdItemD(header, 2), quantity("CurrentSpeed"), "Current speed",
                              metrePerSecond, RCF_FLOAT), "item 2"))
        goto done;
    for (n = 1; n <= 2; ++n)
        if (failed(grdSetItemAxisEqD2(grdItemD(header, n), metre, NX, NY, 0.0f, 0.0f, 50.0f, 50.0f), "grid"))
            goto done;
    if (failed(grdSetEqCalendarAxis(header, "2024-06-01", "00:00:00", QTY_UNIT_SECOND, 0.0, stepSeconds, 0),
               "time axis") ||
        failed(grdSetGeoInfoUTMProj(header, "UTM-32N", 9.0, 54.0, 0.0), "projection"))
        goto done;

    /* 3. The file: the header goes to disk now. */
    if (failed(grdFileCreate(path, header, &file), "creating the file")) goto done;

    /* 4. Static items, before any time step: here the bed level. */
    for (j = 0; j < NY; ++j)
        for (i = 0; i < NX; ++i) bed[j * NX + i] = -2.0f - 0.25f * (float)i;
    if (failed(grdStaticCreate(&bedLevel), "static item") ||
        failed(grdStaticSetHeader(header, bedLevel), "static item header") ||
        failed(grdSetItemInfo(header, bedLevel, quantity("BedLevel"), "Bed level", metre, RCF_FLOAT), "bed level") ||
        failed(grdSetItemAxisEqD2(bedLevel, metre, NX, NY, 0.0f, 0.0f, 50.0f, 50.0f), "bed level grid") ||
        failed(grdStaticWrite(bedLevel, file, bed), "writing the bed level"))
        goto done;

    /* 5. Time steps: every item of a step, in item order. The time of the
     * first item is the step's time in the time axis's unit (seconds after
     * the start here); the header's cursor decides which item comes next. */
    for (t = 0; t < STEPS; ++t) {
        const double seconds = t * stepSeconds;
        for (j = 0; j < NY; ++j)
            for (i = 0; i < NX; ++i) {
                const double phase = 2.0 * 3.14159265358979 * seconds / 44700.0 - 0.05 * i;
                level[j * NX + i] = (float)(0.8 * cos(phase));
                speed[j * NX + i] = (float)(0.3 * fabs(sin(phase)));
            }
        level[0] = grdGetDeleteValFloat(header); /* a dry cell */
        if (failed(grdWriteItemTimeStep(header, file, seconds, level), "writing the water level") ||
            failed(grdWriteItemTimeStep(header, file, seconds, speed), "writing the current speed"))
            goto done;
    }

    /* 6. Close: the header on disk gets its final time-step count and
     * statistics. */
    if (failed(grdFileClose(header, &file), "closing the file")) goto done;
    printf("grd_write: %s: %d time steps of 2 items on a %d x %d grid\n", path, STEPS, NX, NY);
    rc = 0;

done:
    if (file != NULL) rcfFileClose(&file); /* only after a failure */
    grdStaticDestroy(&bedLevel);
    grdHeaderDestroy(&header);
    return rc;
}
