/*
 * Reads a gridded data file: what the header says (titles, time axis, items
 * with their quantity and unit keys), the static items, and then values of a
 * chosen time step, found by positioning instead of reading every step
 * before it.
 *
 *   grd_read [file] [time step]     (default model_result.grd, the middle step)
 */
#include <stdio.h>
#include <stdlib.h>

#include <tova/grd.h>

static int failed(int32_t status, const char* what) {
    if (status == F_NO_ERROR) return 0;
    fprintf(stderr, "grd_read: %s: %s\n", what, grdGetStatusText(status));
    return 1;
}

/* The time axis, whatever its kind; returns the number of time steps. */
static int32_t printTimeAxis(HeaderHandle header) {
    const char *unitText = "", *date = "", *time = "";
    double start = 0.0, step = 0.0;
    int32_t steps = 0, first = 0;
    switch (grdGetTimeAxisType(header)) {
    case F_TM_EQ_AXIS:
        grdGetEqTimeAxis(header, NULL, &unitText, &start, &step, &steps, &first);
        printf("time axis: %d steps from %g %s, every %g %s\n", steps, start, unitText, step, unitText);
        break;
    case F_TM_NEQ_AXIS:
        grdGetNeqTimeAxis(header, NULL, &unitText, &start, NULL, &steps, &first);
        printf("time axis: %d steps at given times (%s) from %g\n", steps, unitText, start);
        break;
    case F_CAL_EQ_AXIS:
        grdGetEqCalendarAxis(header, NULL, &unitText, &date, &time, NULL, &step, &steps, &first);
        printf("time axis: %d steps from %s %s, every %g %s\n", steps, date, time, step, unitText);
        break;
    case F_CAL_NEQ_AXIS:
        grdGetNeqCalendarAxis(header, NULL, &unitText, &date, &time, NULL, NULL, &steps, &first);
        printf("time axis: %d steps at given times (%s after %s %s)\n", steps, unitText, date, time);
        break;
    default:
        printf("time axis: none\n");
    }
    return steps;
}

int main(int argc, char** argv) {
    const char* path = argc > 1 ? argv[1] : "model_result.grd";
    HeaderHandle header = NULL;
    FileHandle file = NULL;
    ItemHandle item = NULL;
    float* values = NULL;
    int32_t status = 0, n, steps, wanted, largest = 0;
    double time = 0.0, minimum = 0.0, maximum = 0.0;
    int rc = 1;

    if (failed(grdFileRead(path, &header, &file), path)) goto done;
    printf("%s: \"%s\" written by %s\n", path, grdGetFileTitle(header), grdGetAppTitle(header));
    steps = printTimeAxis(header);

    for (n = 1; n <= grdGetNoOfItems(header); ++n) {
        const char *name = "", *typeKey = "", *unitKey = "";
        int32_t type = 0, unit = 0, dataType = 0;
        item = grdItemD(header, n);
        grdGetItemInfo(item, &type, &typeKey, &name, &unit, &unitKey, &dataType);
        grdGetItemStatsGlobal(item, &minimum, &maximum, NULL);
        printf("item %d: %s (%s %d, %s %d) %s, %d values, from %g to %g\n", n, name, typeKey, type, unitKey, unit,
               grdSimpleTypeStr(dataType), grdGetItemElements(item), minimum, maximum);
        if (grdGetItemElements(item) > largest) largest = grdGetItemElements(item);
    }

    /* Static items follow the header; each read gives a new static item. */
    while ((item = grdStaticRead(file, &status)) != NULL) {
        const char* name = "";
        grdGetItemInfo(item, NULL, NULL, &name, NULL, NULL, NULL);
        printf("static item: %s, %d values\n", name, grdGetItemElements(item));
        grdStaticDestroy(&item);
    }
    if (failed(status, "reading the static items")) goto done;

    /* Jump to a time step and read its first item; the rest of the step
     * follows in item order. Time steps and items count from 0 and 1. */
    wanted = argc > 2 ? atoi(argv[2]) : steps / 2;
    values = (float*)malloc(sizeof(float) * (size_t)(largest > 0 ? largest : 1));
    if (values == NULL) goto done;
    if (grdGetItemInfo_(grdItemD(header, 1), NULL, NULL, NULL, &n) != F_NO_ERROR || n != RCF_FLOAT) {
        fprintf(stderr, "grd_read: item 1 does not hold floats\n");
        goto done;
    }
    if (failed(grdFindTimeStep(header, file, wanted), "finding the time step") ||
        failed(grdReadItemTimeStep(header, file, &time, values), "reading item 1"))
        goto done;
    printf("time step %d at %g: item 1 starts %g %g %g\n", wanted, time, values[0], values[1], values[2]);
    rc = 0;

done:
    free(values);
    if (file != NULL) grdFileClose(header, &file);
    grdHeaderDestroy(&header);
    return rc;
}
