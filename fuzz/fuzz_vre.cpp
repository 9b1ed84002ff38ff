// Fuzz target of the VRE files: the input is a whole file. It is read into a
// handle; every size parameter, item, name, panel count and unit is queried
// (items also in every conversion mode) into buffers of exactly the size the
// API promises. When the sizes are modest the handle is then written to a
// second file and read back: every value, unit and size must survive.
#include <cstring>
#include <vector>

#include "fuzz_common.h"
#include "vre/vre_internal.h"

namespace {

// Largest write-back, in bytes of item data; beyond it only the read is
// fuzzed (the writer makes every buffer at the size parameters' length).
constexpr int64_t kWriteBackBytes = 1 << 20;

template <class T>
void sameItem(const CVreHandle::CVectorItem<T>& a, const CVreHandle::CVectorItem<T>& b, const char* what) {
    if (!a.hasBuffer()) return;
    if (!b.hasBuffer() || a.size() != b.size() ||
        (a.size() > 0 && std::memcmp(a.data(), b.data(), size_t(a.size()) * sizeof(T)) != 0))
        fuzz::broken(what);
}

void sameUnits(const CVreHandle::CItem& a, const CVreHandle::CItem& b) {
    if (a.key != b.key || a.unit != b.unit) fuzz::broken("an item's storage unit changed on the way round");
}

// Every item with values after the first read has the same values, the same
// unit and the same length after a write and a second read.
void compare(CVreHandle& a, CVreHandle& b) {
    for (int32_t i = 0; i < VRE_SIZE_PARAMS; ++i) {
        if (*a.param(i) != *b.param(i)) fuzz::broken("a size parameter changed on the way round");
    }
    for (int32_t i = 0; i < VRE_VECTOR_ITEMS; ++i) {
        sameItem(*a.vectorItem(i), *b.vectorItem(i), "a vector item changed on the way round");
        if (a.vectorItem(i)->hasBuffer()) sameUnits(*a.vectorItem(i), *b.vectorItem(i));
    }
    for (int32_t i = 0; i < VRE_SCALAR_ITEMS; ++i) {
        const double va = a.scalarItem(i)->value;
        const double vb = b.scalarItem(i)->value;
        if (std::memcmp(&va, &vb, sizeof va) != 0) fuzz::broken("a scalar changed on the way round");
        sameUnits(*a.scalarItem(i), *b.scalarItem(i));
    }
    sameItem(a.names, b.names, "body names changed on the way round");
    sameItem(a.panelCounts, b.panelCounts, "panel counts changed on the way round");
    if (a.symmetry[0] != b.symmetry[0] || a.symmetry[1] != b.symmetry[1]) fuzz::broken("symmetry changed");
}

bool modestSizes(const CVreHandle& h) {
    int64_t bytes = 0;
    for (int32_t i = 0; i < VRE_VECTOR_ITEMS; ++i) {
        const int64_t n = h.elementCount(i);
        if (n < 0) return false;
        bytes += n * 8;
    }
    if (h.nameCount() < 0 || h.bodyCount() < 0) return false;
    bytes += h.nameCount() * VRE_NAME_LENGTH + h.bodyCount() * 4;
    return bytes <= kWriteBackBytes;
}

void queryItems(VreHandle h, size_t fileSize) {
    for (int32_t i = -1; i <= VRE_VECTOR_ITEMS; ++i) {
        const int32_t n = vreGetVectorSize(h, i);
        if (n < 0 || uint64_t(n) * 8 > fileSize) fuzz::broken("an item is longer than the file could hold");
        int32_t key = 0, unit = 0, mode = 0, userUnit = 0;
        vreGetVectorItemUnitInfo(h, i, &key, &unit, &mode, &userUnit);
        std::vector<double> values(static_cast<size_t>(n));
        double none = 0.0;
        double* out = n > 0 ? values.data() : &none;
        fuzz::keep(static_cast<uint32_t>(vreGetVectorItem(h, i, out)));
        // Every conversion mode, then back to none; 999 is no unit at all.
        for (int32_t m : {int32_t{VRE_CONVERT_USER}, int32_t{VRE_CONVERT_EXPLICIT}, int32_t{VRE_CONVERT_BASE}, 7}) {
            vreSetVectorItemUnitConversion(h, i, m, m == 7 ? 999 : userUnit);
            if (vreGetVectorItem(h, i, out) == 0) fuzz::keep(fuzz::touch(out, size_t(n) * 8));
        }
        vreSetVectorItemUnitConversion(h, i, VRE_CONVERT_NONE, userUnit);
    }
    for (int32_t i = -1; i <= VRE_SCALAR_ITEMS; ++i) {
        int32_t key = 0, unit = 0, mode = 0, userUnit = 0;
        vreGetScalarItemUnitInfo(h, i, &key, &unit, &mode, &userUnit);
        for (int32_t m : {VRE_CONVERT_NONE, VRE_CONVERT_USER, VRE_CONVERT_EXPLICIT, VRE_CONVERT_BASE}) {
            vreSetScalarItemUnitConversion(h, i, m, userUnit);
            const double v = vreGetScalarItem(h, i);
            fuzz::keep(fuzz::touch(&v, sizeof v));
        }
        vreSetScalarItemUnitConversion(h, i, VRE_CONVERT_NONE, userUnit);
    }
}

void queryBodies(VreHandle h, size_t fileSize) {
    const int32_t bodies = vreGetVectorParam(h, 1);
    // A caller provides B names and B counts; skip what no file this size
    // could describe (the library would make a buffer of that size).
    if (bodies < 0 || uint64_t(bodies) * 4 > fileSize) return;
    std::vector<int32_t> counts(size_t(bodies) + 1);
    if (vreGetBodyPanelCount(h, counts.data()) == 0) fuzz::keep(fuzz::touch(counts.data(), size_t(bodies) * 4));
    if (uint64_t(bodies) * VRE_NAME_LENGTH <= fileSize) {
        std::vector<char> names(size_t(bodies) * VRE_NAME_LENGTH + 1);
        if (vreGetBodyNames(h, names.data()) == 0) fuzz::keep(fuzz::touch(names.data(), names.size() - 1));
    }
    int32_t first = 0, second = 0;
    vreGetSymmetry(h, &first, &second);
    fuzz::keep(static_cast<uint32_t>(first) + static_cast<uint32_t>(second));
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static fuzz::MemFile input("fuzz-vre");
    static fuzz::MemFile output("fuzz-vre-out");
    input.assign(data, size);

    VreHandle h = nullptr;
    vreFileRead(input.path(), &h);
    if (h == nullptr) fuzz::broken("vreFileRead gave no handle");
    for (int32_t i = -1; i <= VRE_SIZE_PARAMS; ++i) fuzz::keep(static_cast<uint32_t>(vreGetVectorParam(h, i)));

    queryItems(h, size);
    queryBodies(h, size);
    if (modestSizes(*h)) {
        // The writer makes the buffers of items never read, filled with zeros.
        if (vreFileWrite(output.path(), h) != 0) fuzz::broken("a handle read from a file did not write");
        VreHandle again = nullptr;
        if (vreFileRead(output.path(), &again) != 0 || again == nullptr) fuzz::broken("a written file did not read");
        compare(*h, *again);
        vreHandleFree(again);
    }
    vreHandleFree(h);
    return 0;
}
