// Gridded data-file layer, module grdio: the process-wide table of user error
// handlers, the status dispatcher and the API trace switch.
//
// The handler table is an array of atomics so that threads working on
// distinct files may report failures while handlers stay untouched; handlers
// are meant to be installed before files are used.
#include "grd/grdio.h"

#include <array>
#include <atomic>

#include "trace/trace_internal.h"

namespace {

constexpr int kHandlerSlots = 22;
std::array<std::atomic<grdErrorHandler>, kHandlerSlots> g_handlers{};

void clearHandlers() {
    for (auto& slot : g_handlers) slot.store(nullptr, std::memory_order_relaxed);
}

}  // namespace

int32_t grdHandlerSlot(int32_t code) {
    if (code == 1000) return 0;
    if (code >= 2000 && code <= 2020) return code - 2000 + 1;
    return -1;
}

int32_t grdReportError(HeaderHandle header, FileHandle file, int32_t extra, int32_t code, const char* module,
                       int32_t line) {
    const int32_t slot = grdHandlerSlot(code);
    if (slot < 0) return code;
    grdErrorHandler handler = g_handlers[static_cast<size_t>(slot)].load(std::memory_order_acquire);
    if (handler != nullptr) handler(header, file, extra, code, module, line);
    return code;
}

extern "C" {

intptr_t TOVA_CALL grdAddErrorHandler(int32_t code, grdErrorHandler handler) {
    // 2020 has no case here on purpose: its slot can be served but not set.
    if (code == 1000 || (code >= 2000 && code <= 2019)) {
        g_handlers[static_cast<size_t>(grdHandlerSlot(code))].store(handler, std::memory_order_release);
        return reinterpret_cast<intptr_t>(handler);
    }
    return code > 2000 ? code - 2001 : code;
}

intptr_t TOVA_CALL grdAddCommonErrorHandler(grdErrorHandler /*handler*/) {
    // Resets handling to no handlers at all; the argument is not stored.
    clearHandlers();
    return reinterpret_cast<intptr_t>(&g_handlers);
}

void TOVA_CALL grdInitSystem(void) { clearHandlers(); }

int32_t TOVA_CALL grdDebugOn(int32_t flag) {
    tova::g_traceApi.store(flag, std::memory_order_relaxed);
    return flag;
}

}  // extern "C"
