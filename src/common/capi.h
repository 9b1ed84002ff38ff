// Helpers for the C boundary: no C++ exception may leave an exported function.
// Allocation failure becomes F_ERR_MEMORY (2000); anything else unexpected
// becomes F_ERR_VALUE (2010).
#pragma once

#include <new>
#include <utility>

#include "tova/status.h"

namespace tova {

// Runs fn() and maps escaping exceptions to a status code.
template <class Fn>
inline int32_t guarded(Fn&& fn) noexcept {
    try {
        return std::forward<Fn>(fn)();
    } catch (const std::bad_alloc&) {
        return F_ERR_MEMORY;
    } catch (...) {
        return F_ERR_VALUE;
    }
}

// Runs fn() and returns fallback if an exception escapes (for getters that
// return a value rather than a status).
template <class T, class Fn>
inline T guardedValue(T fallback, Fn&& fn) noexcept {
    try {
        return std::forward<Fn>(fn)();
    } catch (...) {
        return fallback;
    }
}

}  // namespace tova
