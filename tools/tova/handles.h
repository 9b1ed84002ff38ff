// Owning pointers for the library's handles, and the record-file open that
// the tool uses for files of any application.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <type_traits>

#include "tova/rcf.h"
#include "tova/vre.h"

namespace tova_cli {

struct RcfClose {
    void operator()(FileHandle h) const { rcfFileClose(&h); }
};
using RcfFilePtr = std::unique_ptr<std::remove_pointer_t<FileHandle>, RcfClose>;

struct VreFree {
    void operator()(VreHandle h) const { vreHandleFree(h); }
};
using VrePtr = std::unique_ptr<std::remove_pointer_t<VreHandle>, VreFree>;

// Opens path for reading as a record file of any application; *status is the
// open's status (the pointer is null unless it is 0).
RcfFilePtr openRecordFile(const std::string& path, int32_t* status);

}  // namespace tova_cli
