/* Compiles every public header as C99 and calls a few exported functions
 * through the shared library. */
#include <stdio.h>
#include <string.h>

#include "qty/qty.h"
#include "tova/grd.h"
#include "tova/grdext.h"
#include "tova/rcf.h"
#include "tova/status.h"
#include "tova/trace.h"
#include "tova/vre.h"
#include "tova/workspace.h"
#include "tova/xfs.h"

int main(void) {
    if (rcfGetVersionCurrent() != 104) return 1;
    if (strcmp(rcfSimpName(RCF_DOUBLE), "double") != 0) return 2;
    if (rcfSimpSize(RCF_INT2) != 2) return 3;
    if (grdDebugOn(0) != 0) return 4;
    if (grdAddErrorHandler(2020, NULL) != 19) return 5;
    if (TdShortCut_IsShortcut("a.LNK") != 1) return 6;
    {
        int32_t metre = 0, foot = 0;
        double feet = 0.0;
        if (!qtyGetUnitTag("m", &metre) || !qtyGetUnitTag("ft", &foot)) return 7;
        if (!qtyItemUnitEqv(QTY_ITEM_GEOMETRY_1D, foot)) return 8;
        if (!qtyConvertUnit(metre, 0.9144, foot, &feet) || feet < 2.999999 || feet > 3.000001) return 9;
    }
    {
        VreHandle vre = vreHandleCreate();
        int32_t first = 0, second = 0;
        if (vre == NULL) return 10;
        if (vreGetSymmetry(vre, &first, &second) != 0 || first != 1 || second != 0) return 11;
        if (vreGetVectorParam(vre, 8) != -1) return 12;
        vreHandleFree(vre);
    }
    /* The cross-section record has the same packed layout in C. */
    if (sizeof(XsecData) != (sizeof(void*) == 4 ? 338u : 418u)) return 13;
    if (xfsXsecTableVersion(NULL) != 100) return 14;
    {
        XsecHandle x = xfsXsecCreate("river", 1.5, "reach");
        if (x == NULL || x->headerWords[23] != 2 || x->headerValues[15] != 0.001) return 15;
        if (xfsXsecSetNoRaw(x, 3) != 1 || x->noRaw != 3) return 16;
        x->raw[2][2] = 4.0;
        x->rawMark[1][2] = 7;
        xfsXsecFree(&x);
        if (x != NULL) return 17;
    }
    {
        /* The plug-in interface: entry-point types and names. */
        grdExtReadItemTimeStepFn read = NULL;
        int32_t next = 0;
        if (read != NULL || strcmp(GRD_EXT_READ_ITEM_TIME_STEP, "grdExtReadItemTimeStep") != 0) return 18;
        if (grdGetItemCursor(NULL, &next, NULL) != 1000 || grdEnablePlugin(NULL, NULL) != 1000) return 19;
    }
    puts("C API ok");
    return 0;
}
