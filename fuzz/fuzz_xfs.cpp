// Fuzz target of the cross-section files: the input is a whole file. It is
// loaded with and without the keys-only flag; every cross section of the
// table is read in full, found by its keys and walked to from both sides;
// the valid ones are written to a second file, which must load back whole.
#include <cmath>
#include <cstring>
#include <vector>

#include "fuzz_common.h"
#include "xsec/xsec.h"

namespace {

// Reads every byte that the record points at.
void touchRecord(const XsecData& rec) {
    const char* names[] = {rec.primaryName, rec.secondaryName, rec.extraName};
    for (const char* name : names) {
        if (name == nullptr) fuzz::broken("a valid cross section has a null name");
        fuzz::keep(fuzz::touch(name, std::strlen(name) + 1));
    }
    fuzz::keep(fuzz::touch(&rec, sizeof rec));  // header words and values included
    auto column = [](const void* values, uint32_t count, size_t size) {
        if (count != 0 && values == nullptr) fuzz::broken("a data set lacks an array");
        if (count == 0 && values != nullptr) fuzz::broken("an empty data set has an array");
        if (values != nullptr) fuzz::keep(fuzz::touch(values, size_t{count} * size));
    };
    const uint32_t noRaw = rec.noRaw;
    for (const double* values : {rec.raw[0], rec.raw[1], rec.raw[2]}) column(values, noRaw, 8);
    // Raw columns 3-5 are present or absent together.
    const double* raw3 = rec.raw3;
    const uint16_t* marks[] = {rec.rawMark[0], rec.rawMark[1]};
    if ((raw3 == nullptr) != (marks[0] == nullptr) || (raw3 == nullptr) != (marks[1] == nullptr))
        fuzz::broken("raw columns 3-5 are not a group");
    if (raw3 != nullptr) {
        column(raw3, noRaw, 8);
        for (const uint16_t* m : marks) column(m, noRaw, 2);
    }
    column(rec.sel, rec.noSel, 8);
    for (const double* values : {rec.prc[0], rec.prc[1], rec.prc[2], rec.prc[3], rec.prc[4], rec.prc[5]})
        column(values, rec.noPrc, 8);
    for (const double* values : {rec.coords[0], rec.coords[1], rec.coords[2]}) column(values, rec.noCoords, 8);
}

bool bothNumbers(const XsecData& a, const XsecData& b) { return !std::isnan(a.keyValue) && !std::isnan(b.keyValue); }

// Walks the table through the API and checks what a reader relies on.
// Returns the valid cross sections in table order.
std::vector<XsecHandle> explore(XsecTableHandle table, bool withCursor, bool keysOnly) {
    std::vector<XsecHandle> valid;
    XsecTable* t = xsecTableResolve(table);
    if (t == nullptr) fuzz::broken("a loaded table does not resolve");
    const XsecData* previous = nullptr;
    for (CTDxSec* sec : t->list) {
        XsecHandle h = sec->publicRecord();
        if (h == nullptr) continue;
        touchRecord(*h);
        if (keysOnly && (h->noRaw | h->noSel | h->noPrc | h->noCoords) != 0)
            fuzz::broken("a keys-only load kept a data set");
        if (previous != nullptr && bothNumbers(*previous, *h) &&
            xsecKeyOrder(previous->primaryName, previous->secondaryName, previous->keyValue, h->primaryName,
                         h->secondaryName, h->keyValue) > 0)
            fuzz::broken("the table is not in key order");
        previous = h;
        valid.push_back(h);

        // Found by its own keys (or an earlier invalid equal), and reachable
        // from both neighbours.
        XsecHandle found = xfsXsecFind(table, h->primaryName, h->keyValue, h->secondaryName, nullptr);
        if (found != nullptr && !std::isnan(h->keyValue) &&
            xsecKeyOrder(found->primaryName, found->secondaryName, found->keyValue, h->primaryName,
                         h->secondaryName, h->keyValue) != 0)
            fuzz::broken("find returned another key");
        if (XsecHandle next = xfsXsecNext(table, h)) {
            if (xfsXsecPrev(table, next) != h) fuzz::broken("next and previous disagree");
        }
        if (XsecHandle prev = xfsXsecPrev(table, h)) {
            if (xfsXsecNext(table, prev) != h) fuzz::broken("previous and next disagree");
        }
    }
    // A walk over the whole table: a cursor lives as long as the library,
    // so only one walk per input makes one.
    if (withCursor) {
        XsecCursor cursor = nullptr;
        size_t steps = 0;
        for (XsecHandle h = xfsXsecFind(table, "", 0.0, "", &cursor); h != nullptr && steps <= t->list.size();
             h = xfsXsecFindNext(table, cursor))
            ++steps;
        if (steps > t->list.size()) fuzz::broken("the walk did not end");
    }
    fuzz::keep(static_cast<uint32_t>(xfsXsecTableVersion(table)));
    return valid;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static fuzz::MemFile input("fuzz-xfs");
    static fuzz::MemFile output("fuzz-xfs-out");
    input.assign(data, size);

    XsecTableHandle keys = nullptr;
    if (xfsXsecTableLoad(input.path(), &keys, XFS_LOAD_KEYS_ONLY) == 0) {
        explore(keys, false, true);
        xfsXsecTableFree(&keys);
    }
    if (keys != nullptr) fuzz::broken("a failed load or a free left a table");

    XsecTableHandle table = nullptr;
    if (xfsXsecTableLoad(input.path(), &table, 0) != 0) {
        if (table != nullptr) fuzz::broken("a failed load returned a table");
        return 0;
    }
    const std::vector<XsecHandle> valid = explore(table, true, false);

    // What was loaded writes out and loads back whole.
    FileHandle out = nullptr;
    if (xfsFileOpenCreate(output.path(), &out) != 0) fuzz::broken("cannot create the output");
    for (XsecHandle h : valid) {
        if (xfsXsecWrite(h, out) != 0) fuzz::broken("a loaded cross section did not write");
    }
    if (xfsFileClose(&out) != 0) fuzz::broken("close failed");
    xfsXsecTableFree(&table);

    XsecTableHandle again = nullptr;
    if (xfsXsecTableLoad(output.path(), &again, 0) != 0) fuzz::broken("a written file did not load");
    if (explore(again, false, false).size() != valid.size()) fuzz::broken("a written file lost cross sections");
    xfsXsecTableFree(&again);
    return 0;
}
