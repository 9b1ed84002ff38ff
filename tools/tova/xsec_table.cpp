// Loading and walking a cross-section table (see xsec_table.h).
#include "xsec_table.h"

namespace tova_cli {

void XsecTableFree::operator()(XsecTableHandle table) const { xfsXsecTableFree(&table); }

XsecTablePtr loadXsecTable(const std::string& path, int32_t* status) {
    XsecTableHandle table = nullptr;
    *status = xfsXsecTableLoad(path.c_str(), &table, 0);
    return XsecTablePtr(table);
}

std::vector<XsecHandle> walkXsecTable(XsecTableHandle table) {
    std::vector<XsecHandle> sections;
    XsecCursor cursor = nullptr;
    for (XsecHandle x = xfsXsecFind(table, "", 0.0, "", &cursor); x != nullptr; x = xfsXsecFindNext(table, cursor)) {
        sections.push_back(x);
    }
    return sections;
}

}  // namespace tova_cli
