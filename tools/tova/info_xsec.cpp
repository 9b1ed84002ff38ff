// The cross-section part of `tova info`: the format version, the number of
// cross sections and a table of their keys (primary name, secondary name, key
// value, extra name) with the sizes of their four data sets, in table order.
#include "tova/xfs.h"
#include "tova_cli.h"
#include "xsec_table.h"

namespace tova_cli {

Value describeXsec(const RecordFileInfo& file) {
    int32_t status = 0;
    const XsecTablePtr table = loadXsecTable(file.path, &status);
    if (status != F_NO_ERROR || !table) {
        throw Failure(file.path + ": the cross-section loader failed: status " + statusText(status));
    }
    const std::vector<XsecHandle> sections = walkXsecTable(table.get());

    Value xfs = Value::object();
    xfs.add("formatVersion", xfsXsecTableVersion(table.get()));
    xfs.add("count", sections.size());
    Value& rows = xfs.add("sections", Value::array());
    for (const XsecHandle x : sections) {
        Value& row = rows.push(Value::object());
        row.add("primary", x->primaryName);
        row.add("secondary", x->secondaryName);
        row.add("key", x->keyValue);
        row.add("extra", x->extraName);
        row.add("raw", x->noRaw);
        row.add("selection", x->noSel);
        row.add("processed", x->noPrc);
        row.add("coordinates", x->noCoords);
    }
    return xfs;
}

}  // namespace tova_cli
