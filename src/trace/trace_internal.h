// Call tracing, internal interface: the two process-wide trace switches that
// callers test before every trace call (the trace functions do not test them).
#pragma once

#include <atomic>
#include <cstdint>

namespace tova {

// API trace flag, set by grdDebugOn to the value given.
extern std::atomic<int32_t> g_traceApi;
// File-I/O trace flag (0 or 1), set by DebugFileIO.
extern std::atomic<int32_t> g_traceFileIo;

inline bool traceApiOn() noexcept { return g_traceApi.load(std::memory_order_relaxed) != 0; }
inline bool traceFileIoOn() noexcept { return g_traceFileIo.load(std::memory_order_relaxed) != 0; }

}  // namespace tova
