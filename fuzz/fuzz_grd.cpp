// Fuzz target of the gridded data files: the input is a whole file. It is
// opened for reading and read through every getter and data call
// (grd_read.h) before the file is closed; then the crash-recovery calls meet
// the same bytes: the walk over the time steps, the recovery and an append.
#include "fuzz_common.h"
#include "grd_read.h"
#include "tova/grd.h"
#include "tova/rcf.h"

namespace {

// What follows a crash meets the same untrusted bytes: the walk over the
// time steps, the header brought up to date with it, and an append that
// continues after the last whole time step. Once recovered, a file's header
// counts exactly the time steps a second walk finds.
void recoverAndAppend(const char* path) {
    int32_t found = 0;
    int32_t inHeader = 0;
    int64_t tail = 0;
    grdFileScan(path, &found, &inHeader, &tail);
    if (grdFileRecover(path, &found, &inHeader) == 0 && grdFileScan(path, &found, &inHeader, &tail) == 0 &&
        found != inHeader)
        fuzz::broken("a recovered header does not count the whole time steps");
    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    if (grdFileAppend(path, &h, &f) != 0) {
        if (h != nullptr || f != nullptr) fuzz::broken("a failed append gave out a handle");
        return;
    }
    // A close whose header update fails keeps the file open; give it up.
    if (grdFileClose(h, &f) != 0 && f != nullptr) rcfFileClose(&f);
    grdHeaderDestroy(&h);
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static fuzz::MemFile input("fuzz-grd");
    input.assign(data, size);

    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    if (grdFileRead(input.path(), &h, &f) != 0) {
        if (h != nullptr || f != nullptr) fuzz::broken("a failed open gave out a handle");
        return 0;
    }
    if (h == nullptr || f == nullptr) fuzz::broken("an open gave no handles");
    grdread::readWholeFile(h, f, size);
    if (grdFileClose(h, &f) != 0 || f != nullptr) fuzz::broken("a file open for reading did not close");
    if (grdHeaderDestroy(&h) != 0 || h != nullptr) fuzz::broken("the header did not destroy");
    recoverAndAppend(input.path());
    return 0;
}
