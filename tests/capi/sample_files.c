/*
 * Writes and reads one gridded data file, one cross-section file and one VRE
 * file through the public headers alone. Built for every platform, it checks
 * that files cross platforms: the same program writes the same bytes
 * everywhere (apart from the time stamps in the record-file header), and what
 * one platform wrote reads back on the other with the same values.
 *
 *   sample_files write FOLDER   writes sample.grd, sample.xfs, sample.vre
 *   sample_files read FOLDER    prints what the three files hold
 *
 * The exit status is 0 when every call succeeded.
 */
#include <stdio.h>
#include <string.h>

#include "qty/qty.h"
#include "tova/grd.h"
#include "tova/vre.h"
#include "tova/xfs.h"

enum { kNx = 4, kNy = 3, kSteps = 3, kCoords = 5 };

static int g_failures = 0;

static void check(int ok, const char* what) {
    if (!ok) {
        fprintf(stderr, "failed: %s\n", what);
        ++g_failures;
    }
}

static void path(char* out, size_t size, const char* folder, const char* name) {
    snprintf(out, size, "%s/%s", folder, name);
}

static void writeGrd(const char* file) {
    HeaderHandle header = NULL;
    FileHandle handle = NULL;
    float level[kNx * kNy];
    double speed[kNx * kNy];
    check(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "sample", "sample_files", 1, 2, 1, &header) == 0,
          "grdHeaderCreate");
    check(grdSetEqTimeAxis(header, QTY_UNIT_SECOND, 0.0, 1800.0, 0) == 0, "grdSetEqTimeAxis");
    check(grdSetItemInfo(header, grdItemD(header, 1), QTY_ITEM_UNDEFINED, "level", 0, 1) == 0, "item 1");
    check(grdSetItemInfo(header, grdItemD(header, 2), QTY_ITEM_UNDEFINED, "speed", 0, 2) == 0, "item 2");
    for (int k = 1; k <= 2; ++k)
        check(grdSetItemAxisEqD2(grdItemD(header, k), 0, kNx, kNy, 100.0f, 200.0f, 10.0f, 20.0f) == 0, "axis");
    check(grdFileCreate(file, header, &handle) == 0, "grdFileCreate");
    for (int t = 0; t < kSteps; ++t) {
        for (int i = 0; i < kNx * kNy; ++i) {
            level[i] = 0.25f * (float)i + (float)t;
            speed[i] = i == 5 ? F_DELETE_VALUE_DOUBLE : 1.0 / (1.0 + i + t);
        }
        check(grdWriteItemTimeStep(header, handle, 1800.0 * t, level) == 0, "write level");
        check(grdWriteItemTimeStep(header, handle, 1800.0 * t, speed) == 0, "write speed");
    }
    check(grdFileClose(header, &handle) == 0, "grdFileClose");
    grdHeaderDestroy(&header);
}

static void readGrd(const char* file) {
    HeaderHandle header = NULL;
    FileHandle handle = NULL;
    float level[kNx * kNy];
    double speed[kNx * kNy];
    double time = 0.0;
    check(grdFileRead(file, &header, &handle) == 0, "grdFileRead");
    if (header == NULL) return;
    printf("grd: %d items, %d steps\n", grdGetNoOfItems(header), kSteps);
    for (int t = 0; t < kSteps; ++t) {
        check(grdReadItemTimeStep(header, handle, &time, level) == 0, "read level");
        printf("  t=%g level", time);
        for (int i = 0; i < kNx * kNy; ++i) printf(" %.9g", level[i]);
        check(grdReadItemTimeStep(header, handle, &time, speed) == 0, "read speed");
        printf("\n  t=%g speed", time);
        for (int i = 0; i < kNx * kNy; ++i) printf(" %.17g", speed[i]);
        printf("\n");
    }
    check(grdFileClose(header, &handle) == 0, "grdFileClose");
    grdHeaderDestroy(&header);
}

static void writeXfs(const char* file) {
    FileHandle handle = NULL;
    check(xfsFileOpenCreate(file, &handle) == 0, "xfsFileOpenCreate");
    for (int n = 0; n < 2; ++n) {
        XsecHandle xsec = xfsXsecCreate(n == 0 ? "river" : "canal", 100.0 * (n + 1), "topo");
        check(xsec != NULL && xfsXsecSetNoCoords(xsec, kCoords) == 1, "xfsXsecSetNoCoords");
        if (xsec == NULL) continue;
        for (int i = 0; i < kCoords; ++i) {
            xsec->coords[0][i] = 10.0 * i;
            xsec->coords[1][i] = -0.5 * i * (kCoords - 1 - i) - n;
            xsec->coords[2][i] = 0.125 * i;
        }
        check(xfsXsecWrite(xsec, handle) == 0, "xfsXsecWrite");
        xfsXsecFree(&xsec);
    }
    check(xfsFileClose(&handle) == 0, "xfsFileClose");
}

static void readXfs(const char* file) {
    XsecTableHandle table = NULL;
    XsecCursor cursor = NULL;
    check(xfsXsecTableLoad(file, &table, 0) == 0, "xfsXsecTableLoad");
    if (table == NULL) return;
    for (XsecHandle x = xfsXsecFind(table, "", 0.0, "", &cursor); x != NULL; x = xfsXsecNext(table, x)) {
        const double key = x->keyValue;
        printf("xfs: %s %g %s, %u points:", x->primaryName, key, x->secondaryName, (unsigned)x->noCoords);
        for (uint32_t i = 0; i < x->noCoords; ++i)
            printf(" (%g %g %g)", x->coords[0][i], x->coords[1][i], x->coords[2][i]);
        printf("\n");
    }
    xfsXsecTableFree(&table);
}

static void writeVre(const char* file) {
    VreHandle vre = vreHandleCreate();
    check(vre != NULL, "vreHandleCreate");
    if (vre == NULL) return;
    check(vreSetScalarItem(vre, 0, 9.81) == 0, "vreSetScalarItem 0");
    check(vreSetScalarItem(vre, 1, 1025.0) == 0, "vreSetScalarItem 1");
    check(vreSetSymmetry(vre, 1, 1) == 0, "vreSetSymmetry");
    check(vreFileWrite(file, vre) == 0, "vreFileWrite");
    vreHandleFree(vre);
}

static void readVre(const char* file) {
    VreHandle vre = NULL;
    int32_t first = 0, second = 0;
    check(vreFileRead(file, &vre) == 0, "vreFileRead");
    if (vre == NULL) return;
    vreGetSymmetry(vre, &first, &second);
    printf("vre: scalars %.17g %.17g, symmetry %d %d, parameters", vreGetScalarItem(vre, 0),
           vreGetScalarItem(vre, 1), (int)first, (int)second);
    for (int i = 0; i < VRE_SIZE_PARAMS; ++i) printf(" %d", (int)vreGetVectorParam(vre, i));
    printf("\n");
    vreHandleFree(vre);
}

int main(int argc, char** argv) {
    char grd[1024], xfs[1024], vre[1024];
    if (argc != 3 || (strcmp(argv[1], "write") != 0 && strcmp(argv[1], "read") != 0)) {
        fprintf(stderr, "usage: sample_files write|read FOLDER\n");
        return 2;
    }
    path(grd, sizeof grd, argv[2], "sample.grd");
    path(xfs, sizeof xfs, argv[2], "sample.xfs");
    path(vre, sizeof vre, argv[2], "sample.vre");
    if (strcmp(argv[1], "write") == 0) {
        writeGrd(grd);
        writeXfs(xfs);
        writeVre(vre);
    } else {
        readGrd(grd);
        readXfs(xfs);
        readVre(vre);
    }
    return g_failures == 0 ? 0 : 1;
}
