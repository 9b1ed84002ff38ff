// Record-file layer: the one call that asks the operating system to put a
// stream's file on the storage device (durability against power loss). The
// platform's own call is chosen here, the only place that knows it.
#include <cstdio>

#include "rcf/rcf_internal.h"

#ifdef _WIN32
#include <io.h>
#else
#include <unistd.h>
#endif

bool rcfStreamSync(std::FILE* stream) {
    if (stream == nullptr || std::fflush(stream) != 0) return false;
#ifdef _WIN32
    return _commit(_fileno(stream)) == 0;  // FlushFileBuffers on the file's handle
#else
    return fsync(fileno(stream)) == 0;
#endif
}
