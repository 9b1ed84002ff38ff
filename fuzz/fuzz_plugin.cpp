// Fuzz target of the extension plug-ins: the input is a gridded data file,
// opened for reading and given the example plug-in (grdExt_7, which derives
// current speed and direction from the velocity components) with
// grdEnablePlugin, whatever data type the file names; then it is read
// through the plug-in as fuzz_grd reads a file (grd_read.h): the plug-in's
// items, the file's and the derived ones, and every time step of each.
// The plug-in is found by the platform loader through the program's run
// path (see CMakeLists.txt), as a caller's LD_LIBRARY_PATH would find it.
#include <cstdlib>

#include "fuzz_common.h"
#include "grd_read.h"
#include "tova/grd.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static fuzz::MemFile input("fuzz-plugin");
    input.assign(data, size);

    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    if (grdFileRead(input.path(), &h, &f) != 0) return 0;
    grdSetDataType(h, grdGetDataType(h) < 0 ? -7 : 7);
    const int32_t enabled = grdEnablePlugin(h, f);
    if (enabled == -3) fuzz::broken("the example plug-in grdExt_7 cannot be loaded");
    grdread::readWholeFile(h, f, size);
    if (grdFileClose(h, &f) != 0 || f != nullptr) fuzz::broken("a file open for reading did not close");
    if (grdHeaderDestroy(&h) != 0 || h != nullptr) fuzz::broken("the header did not destroy");
    return 0;
}
