// VRE files: the exported vre... functions. Each checks its handle and
// pointers, then works on the CVreHandle; the whole-file calls are in
// vrefile.cpp. Out-of-range indices are answered quietly (-1, 0 or the delete
// value) rather than as failures.
#include <algorithm>
#include <cstring>
#include <memory>

#include "common/capi.h"
#include "vre/vre_internal.h"

namespace {

// Number of bodies that both the caller's array (B entries) and a stored
// buffer hold.
std::int32_t sharedBodies(const CVreHandle& h, std::int32_t stored) {
    return std::clamp(h.bodies, 0, stored);
}

// Bodies the caller's array holds beyond the stored ones (zero-filled on get).
std::size_t missingBodies(const CVreHandle& h, std::int32_t stored) {
    return h.bodies > stored ? static_cast<std::size_t>(h.bodies - stored) : 0;
}

template <class T>
void copyBodiesOut(const CVreHandle& h, const CVreHandle::CVectorItem<T>& item, T* out) {
    const std::int32_t n = sharedBodies(h, item.size());
    if (n > 0) std::memcpy(out, item.data(), static_cast<std::size_t>(n) * sizeof(T));
    const std::size_t rest = missingBodies(h, item.size());
    if (rest > 0) std::memset(out + n, 0, rest * sizeof(T));
}

template <class T>
void copyBodiesIn(const CVreHandle& h, CVreHandle::CVectorItem<T>& item, const T* in) {
    const std::int32_t n = sharedBodies(h, item.size());
    if (n > 0) std::memcpy(item.data(), in, static_cast<std::size_t>(n) * sizeof(T));
}

void unitInfo(const CVreHandle::CItem& item, std::int32_t* key, std::int32_t* unit, std::int32_t* mode,
              std::int32_t* userUnit) {
    if (key) *key = item.key;
    if (unit) *unit = item.unit;
    if (mode) *mode = item.mode;
    if (userUnit) *userUnit = item.userUnit;
}

}  // namespace

extern "C" {

VreHandle TOVA_CALL vreHandleCreate(void) {
    return tova::guardedValue<VreHandle>(nullptr, [] { return std::make_unique<CVreHandle>().release(); });
}

int32_t TOVA_CALL vreHandleFree(VreHandle handle) {
    std::unique_ptr<CVreHandle> owned(handle);
    return F_NO_ERROR;
}

int32_t TOVA_CALL vreFileRead(const char* path, VreHandle* out) {
    if (out == nullptr) return F_ERR_ARGUMENT;
    *out = nullptr;
    return tova::guarded([&]() -> int32_t {
        *out = std::make_unique<CVreHandle>().release();
        if (path == nullptr) return F_ERR_ARGUMENT;
        return vreReadFile(path, **out);
    });
}

int32_t TOVA_CALL vreFileWrite(const char* path, VreHandle handle) {
    if (path == nullptr || handle == nullptr) return F_ERR_ARGUMENT;
    return tova::guarded([&] { return vreWriteFile(path, *handle); });
}

// ---- Size parameters ------------------------------------------------------------

int32_t TOVA_CALL vreGetVectorParam(VreHandle handle, int32_t index) {
    const int32_t* p = handle ? handle->param(index) : nullptr;
    return p ? *p : -1;
}

int32_t TOVA_CALL vreSetVectorParam(VreHandle handle, int32_t index, int32_t value) {
    if (handle == nullptr || index == 2) return F_ERR_ARGUMENT;  // P follows the panel counts
    if (int32_t* p = handle->param(index)) *p = value;
    return F_NO_ERROR;
}

int32_t TOVA_CALL vreGetVectorSize(VreHandle handle, int32_t index) {
    const CVreHandle::DoubleItem* item = handle ? handle->vectorItem(index) : nullptr;
    return item ? item->size() : 0;
}

// ---- Bodies and symmetry ------------------------------------------------------

int32_t TOVA_CALL vreGetBodyNames(VreHandle handle, char* names) {
    if (handle == nullptr || names == nullptr) return F_ERR_ARGUMENT;
    if (!handle->names.hasBuffer()) return VRE_NOT_SET;
    copyBodiesOut(*handle, handle->names, reinterpret_cast<CVreHandle::Name*>(names));
    return F_NO_ERROR;
}

int32_t TOVA_CALL vreSetBodyNames(VreHandle handle, const char* names) {
    if (handle == nullptr || names == nullptr) return F_ERR_ARGUMENT;
    if (!handle->names.buffer(handle->nameCount())) return F_ERR_MEMORY;
    copyBodiesIn(*handle, handle->names, reinterpret_cast<const CVreHandle::Name*>(names));
    return F_NO_ERROR;
}

int32_t TOVA_CALL vreGetBodyPanelCount(VreHandle handle, int32_t* counts) {
    if (handle == nullptr || counts == nullptr) return F_ERR_ARGUMENT;
    if (!handle->panelCounts.buffer(handle->bodyCount())) return F_ERR_VALUE;
    copyBodiesOut(*handle, handle->panelCounts, counts);
    return F_NO_ERROR;
}

int32_t TOVA_CALL vreSetBodyPanelCount(VreHandle handle, const int32_t* counts) {
    if (handle == nullptr || counts == nullptr) return F_ERR_ARGUMENT;
    if (!handle->panelCounts.buffer(handle->bodyCount())) return F_ERR_MEMORY;
    copyBodiesIn(*handle, handle->panelCounts, counts);
    handle->recomputePanelTotal();
    return F_NO_ERROR;
}

int32_t TOVA_CALL vreGetSymmetry(VreHandle handle, int32_t* first, int32_t* second) {
    if (handle == nullptr || first == nullptr || second == nullptr) return F_ERR_ARGUMENT;
    *first = handle->symmetry[0];
    *second = handle->symmetry[1];
    return F_NO_ERROR;
}

int32_t TOVA_CALL vreSetSymmetry(VreHandle handle, int32_t first, int32_t second) {
    if (handle == nullptr) return F_ERR_ARGUMENT;
    handle->symmetry[0] = first;
    handle->symmetry[1] = second;
    return F_NO_ERROR;
}

// ---- Scalar items -------------------------------------------------------------

double TOVA_CALL vreGetScalarItem(VreHandle handle, int32_t index) {
    const CVreHandle::CScalarItem* item = handle ? handle->scalarItem(index) : nullptr;
    return item ? item->toCaller(item->value) : VRE_DELETE_VALUE;
}

int32_t TOVA_CALL vreSetScalarItem(VreHandle handle, int32_t index, double value) {
    if (handle == nullptr) return F_ERR_ARGUMENT;
    if (CVreHandle::CScalarItem* item = handle->scalarItem(index)) item->value = item->fromCaller(value);
    return F_NO_ERROR;
}

// ---- Units ------------------------------------------------------------------------

int32_t TOVA_CALL vreGetScalarItemUnitInfo(VreHandle handle, int32_t index, int32_t* itemKey, int32_t* unit,
                                           int32_t* mode, int32_t* userUnit) {
    if (handle == nullptr) return F_ERR_ARGUMENT;
    if (const CVreHandle::CItem* item = handle->scalarItem(index)) unitInfo(*item, itemKey, unit, mode, userUnit);
    return F_NO_ERROR;
}

int32_t TOVA_CALL vreGetVectorItemUnitInfo(VreHandle handle, int32_t index, int32_t* itemKey, int32_t* unit,
                                           int32_t* mode, int32_t* userUnit) {
    if (handle == nullptr) return F_ERR_ARGUMENT;
    if (const CVreHandle::CItem* item = handle->vectorItem(index)) unitInfo(*item, itemKey, unit, mode, userUnit);
    return F_NO_ERROR;
}

int32_t TOVA_CALL vreSetScalarItemUnit(VreHandle handle, int32_t index, int32_t unit) {
    if (handle == nullptr) return F_ERR_ARGUMENT;
    CVreHandle::CItem* item = handle->scalarItem(index);
    return item ? item->setStorageUnit(unit) : F_NO_ERROR;
}

int32_t TOVA_CALL vreSetVectorItemUnit(VreHandle handle, int32_t index, int32_t unit) {
    if (handle == nullptr) return F_ERR_ARGUMENT;
    CVreHandle::CItem* item = handle->vectorItem(index);
    return item ? item->setStorageUnit(unit) : F_NO_ERROR;
}

int32_t TOVA_CALL vreSetScalarItemUnitConversion(VreHandle handle, int32_t index, int32_t mode, int32_t unit) {
    if (handle == nullptr) return F_ERR_ARGUMENT;
    CVreHandle::CItem* item = handle->scalarItem(index);
    return item ? item->setConversion(mode, unit) : F_NO_ERROR;
}

int32_t TOVA_CALL vreSetVectorItemUnitConversion(VreHandle handle, int32_t index, int32_t mode, int32_t unit) {
    if (handle == nullptr) return F_ERR_ARGUMENT;
    CVreHandle::CItem* item = handle->vectorItem(index);
    return item ? item->setConversion(mode, unit) : F_NO_ERROR;
}

// ---- Vector items -----------------------------------------------------------------

int32_t TOVA_CALL vreGetVectorItem(VreHandle handle, int32_t index, double* values) {
    if (handle == nullptr || values == nullptr) return F_ERR_ARGUMENT;
    const CVreHandle::DoubleItem* item = handle->vectorItem(index);
    if (item == nullptr || !item->hasBuffer()) return VRE_NOT_SET;
    const int32_t n = item->size();
    if (n > 0) std::memcpy(values, item->data(), static_cast<std::size_t>(n) * sizeof(double));
    item->toCaller(values, n);
    return F_NO_ERROR;
}

int32_t TOVA_CALL vreSetVectorItem(VreHandle handle, int32_t index, const double* values) {
    if (handle == nullptr || values == nullptr) return F_ERR_ARGUMENT;
    CVreHandle::DoubleItem* item = handle->vectorItem(index);
    if (item == nullptr) return F_ERR_MEMORY;
    double* buffer = item->buffer(handle->elementCount(index));
    if (buffer == nullptr) return F_ERR_MEMORY;
    const int32_t n = item->size();
    if (n > 0) std::memcpy(buffer, values, static_cast<std::size_t>(n) * sizeof(double));
    item->fromCaller(buffer, n);
    return F_NO_ERROR;
}

}  // extern "C"
