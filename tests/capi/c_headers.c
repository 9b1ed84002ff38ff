/* Compiles every public header as C99 and calls a few exported functions
 * through the shared library. */
#include <stdio.h>
#include <string.h>

#include "tova/grd.h"
#include "tova/rcf.h"
#include "tova/status.h"
#include "tova/trace.h"
#include "tova/xfs.h"

int main(void) {
    if (rcfGetVersionCurrent() != 104) return 1;
    if (strcmp(rcfSimpName(RCF_DOUBLE), "double") != 0) return 2;
    if (rcfSimpSize(RCF_INT2) != 2) return 3;
    if (grdDebugOn(0) != 0) return 4;
    if (grdAddErrorHandler(2020, NULL) != 19) return 5;
    /* The cross-section record has the same packed layout in C. */
    if (sizeof(XsecData) != (sizeof(void*) == 4 ? 338u : 418u)) return 6;
    if (xfsXsecTableVersion(NULL) != 100) return 7;
    {
        XsecHandle x = xfsXsecCreate("river", 1.5, "reach");
        if (x == NULL || x->headerWords[23] != 2 || x->headerValues[15] != 0.001) return 8;
        if (xfsXsecSetNoRaw(x, 3) != 1 || x->noRaw != 3) return 9;
        x->raw[2][2] = 4.0;
        x->rawMark[1][2] = 7;
        xfsXsecFree(&x);
        if (x != NULL) return 10;
    }
    puts("C API ok");
    return 0;
}
