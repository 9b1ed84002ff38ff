// Helpers shared by the VRE tests: an owning handle pointer and small
// accessors that return whole arrays.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

#include "qty/qty.h"
#include "tova/vre.h"

namespace vretest {

struct Free {
    void operator()(CVreHandle* h) const { vreHandleFree(h); }
};
using Vre = std::unique_ptr<CVreHandle, Free>;

inline Vre create() { return Vre(vreHandleCreate()); }

// The n-th unit of a quantity's sequence, -1 when there is none.
inline int32_t unitSeq(int32_t key, int32_t n) {
    int32_t unit = -1;
    const char* text = nullptr;
    return qtyGetItemUnitSeq(key, n, &unit, &text) ? unit : -1;
}

// Values of a vector item as vreGetVectorItem gives them; empty when the call
// fails (the status goes to *status when asked for).
inline std::vector<double> vectorItem(CVreHandle* h, int32_t index, int32_t* status = nullptr) {
    std::vector<double> values(static_cast<size_t>(vreGetVectorSize(h, index)) + 1);
    const int32_t rc = vreGetVectorItem(h, index, values.data());
    if (status) *status = rc;
    if (rc != 0) return {};
    values.pop_back();
    return values;
}

inline std::vector<int32_t> panelCounts(CVreHandle* h) {
    const int32_t bodies = vreGetVectorParam(h, 1);
    if (bodies < 0) return {};
    std::vector<int32_t> counts(static_cast<size_t>(bodies) + 1);
    if (vreGetBodyPanelCount(h, counts.data()) != 0) return {};
    counts.pop_back();
    return counts;
}

// Body names as strings; empty when the handle holds none.
inline std::vector<std::string> bodyNames(CVreHandle* h) {
    const int32_t bodies = vreGetVectorParam(h, 1);
    if (bodies < 0) return {};
    std::vector<char> raw(static_cast<size_t>(bodies) * VRE_NAME_LENGTH + 1);
    if (vreGetBodyNames(h, raw.data()) != 0) return {};
    std::vector<std::string> names;
    for (int32_t i = 0; i < bodies; ++i) names.emplace_back(raw.data() + static_cast<size_t>(i) * VRE_NAME_LENGTH);
    return names;
}

// Element counts of the 23 vector items for the given size parameters.
inline std::vector<int32_t> expectedSizes(int32_t n0, int32_t b, int32_t p, int32_t n3, int32_t n4, int32_t n7) {
    return {12 * n0,     3 * p,       p,            3 * p,        p * n3, 3 * b, 3 * b, b,
            n3 * n3,     n4,          n4,           9 * b,        p * n4 * n3, p * n4 * n3,
            n4 * n3 * n3, n4 * n3 * n3, b, b, b, b, b, n7, n7 * n4 * n3};
}

inline std::vector<char> packNames(const std::vector<std::string>& names) {
    std::vector<char> raw(names.size() * VRE_NAME_LENGTH, '\0');
    for (size_t i = 0; i < names.size(); ++i) names[i].copy(raw.data() + i * VRE_NAME_LENGTH, VRE_NAME_LENGTH - 1);
    return raw;
}

}  // namespace vretest
