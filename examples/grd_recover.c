/*
 * Continues a model run after a crash. The first run writes time steps and
 * is killed before it closes its file; the next run brings the header up to
 * date with what the file holds (grdFileRecover), opens it for appending
 * (grdFileAppend) and writes the remaining time steps after the last
 * complete one, as an engine restarted from its last saved state would.
 *
 *   grd_recover crash FILE      writes 30 of 48 steps, then dies
 *   grd_recover continue FILE   recovers, appends up to 48 steps, checks
 */
#include <stdio.h>
#include <stdlib.h>
#include <string.h>

#include <qty/qty.h>
#include <tova/grd.h>

enum { NX = 64, NY = 64, STEPS = 48, CRASH_AFTER = 30 };

static int failed(int32_t status, const char* what) {
    if (status == F_NO_ERROR) return 0;
    fprintf(stderr, "grd_recover: %s: %s\n", what, grdGetStatusText(status));
    return 1;
}

/* The model state of a time step: values the reader can check. */
static void fill(float* values, int32_t step) {
    int32_t e;
    for (e = 0; e < NX * NY; ++e) values[e] = (float)step + (float)e * 1e-4f;
}

static int crash(const char* path) {
    static float values[NX * NY];
    HeaderHandle header = NULL;
    FileHandle file = NULL;
    int32_t step;
    if (failed(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "Run to be continued", "grd_recover example", 1, 1,
                               F_ITEM_STATS_GLOBAL, &header), "creating the header") ||
        failed(grdSetItemInfo(header, grdItemD(header, 1), QTY_ITEM_UNDEFINED, "Tracer", QTY_UNIT_UNDEFINED,
                              RCF_FLOAT), "item") ||
        failed(grdSetItemAxisEqD2(grdItemD(header, 1), QTY_UNIT_UNDEFINED, NX, NY, 0, 0, 1, 1), "grid") ||
        failed(grdSetEqTimeAxis(header, QTY_UNIT_SECOND, 0.0, 60.0, 0), "time axis") ||
        failed(grdFileCreate(path, header, &file), "creating the file"))
        return 1;
    for (step = 0; step < CRASH_AFTER; ++step) {
        fill(values, step);
        if (failed(grdWriteItemTimeStep(header, file, step * 60.0, values), "writing")) return 1;
    }
    /* Killed here: no close, and the library's buffered output is lost as
     * well. */
    printf("grd_recover: killed after %d time steps\n", CRASH_AFTER);
    fflush(stdout);
    _Exit(3);
}

static int resume(const char* path) {
    static float values[NX * NY], expected[NX * NY];
    HeaderHandle header = NULL;
    FileHandle file = NULL;
    int32_t found = 0, inHeader = 0, step = 0, steps = 0;
    double time = 0.0;
    int rc = 1;

    /* The header may count fewer steps than the file holds; a step cut
     * short by the crash stays uncounted. */
    if (failed(grdFileRecover(path, &found, &inHeader), "recovering")) return 1;
    printf("grd_recover: the header counted %d time steps, the file holds %d complete ones\n", inHeader, found);

    /* Appending continues after the last complete time step: the engine
     * restarts from that step's state. */
    if (failed(grdFileAppend(path, &header, &file), "opening to append")) return 1;
    for (step = found; step < STEPS; ++step) {
        fill(values, step);
        if (failed(grdWriteItemTimeStep(header, file, step * 60.0, values), "writing")) goto done;
    }
    if (failed(grdFileClose(header, &file), "closing")) goto done;
    grdHeaderDestroy(&header);

    /* Every step is there, in order, with its values. */
    if (failed(grdFileRead(path, &header, &file), "reading back")) goto done;
    grdGetEqTimeAxis(header, NULL, NULL, NULL, NULL, &steps, NULL);
    for (step = 0; step < steps; ++step) {
        fill(expected, step);
        if (failed(grdReadItemTimeStep(header, file, &time, values), "reading")) goto done;
        if (memcmp(values, expected, sizeof(values)) != 0) {
            fprintf(stderr, "grd_recover: time step %d holds other values\n", step);
            goto done;
        }
    }
    if (steps != STEPS) {
        fprintf(stderr, "grd_recover: %d time steps, not %d\n", steps, STEPS);
        goto done;
    }
    printf("grd_recover: %s holds all %d time steps\n", path, steps);
    rc = 0;

done:
    if (file != NULL) grdFileClose(header, &file);
    grdHeaderDestroy(&header);
    return rc;
}

int main(int argc, char** argv) {
    if (argc == 3 && strcmp(argv[1], "crash") == 0) return crash(argv[2]);
    if (argc == 3 && strcmp(argv[1], "continue") == 0) return resume(argv[2]);
    fprintf(stderr, "usage: grd_recover crash|continue FILE\n");
    return 2;
}
