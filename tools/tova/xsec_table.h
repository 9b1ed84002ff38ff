// A loaded cross-section table for `info` and `check`: an owning pointer, the
// load, and the walk over every cross section in table order.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <type_traits>
#include <vector>

#include "tova/xfs.h"

namespace tova_cli {

struct XsecTableFree {
    void operator()(XsecTableHandle table) const;
};
using XsecTablePtr = std::unique_ptr<std::remove_pointer_t<XsecTableHandle>, XsecTableFree>;

// Loads the whole file (keys, headers and data sets); *status is the load's.
XsecTablePtr loadXsecTable(const std::string& path, int32_t* status);

// The cross sections in table order. The walk ends at the first invalid one.
std::vector<XsecHandle> walkXsecTable(XsecTableHandle table);

}  // namespace tova_cli
