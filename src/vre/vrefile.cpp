// VRE files: whole-file transfer between a record file ("VRE_", format
// version 101; version 100 is also read) and a CVreHandle. The body of a file
// is a flat sequence of records without blocks: size parameters as one-element
// "integer*4" records, each item as a group (index, storage unit, values).
//
// A file's contents are never trusted: each buffer is made at the length the
// size parameters read so far give, only when the rest of the file can hold
// that many values, and a record that does not fit stops the reading. Reading
// errors leave the handle with what was read until then.
#include <algorithm>
#include <cstring>
#include <filesystem>
#include <memory>
#include <system_error>
#include <type_traits>

#include "qty/qty.h"
#include "rcf/rcf_internal.h"
#include "vre/vre_internal.h"

namespace {

constexpr std::uint32_t kVersionWritten = 101;
constexpr std::uint32_t kVersionOld = 100;

std::uint32_t vreAppIdent(std::uint32_t* version) {
    *version = kVersionWritten;
    std::uint32_t tag = 0;
    std::memcpy(&tag, "VRE_", 4);
    return tag;
}

// Records per element of an item: names are stored as 256 "byte" elements.
template <class T>
constexpr std::uint32_t recordElements() {
    return std::is_same_v<T, CVreHandle::Name> ? VRE_NAME_LENGTH : 1;
}

// Closes the file on every way out, exceptions included.
struct FileCloser {
    void operator()(RcfFile* file) const { rcfFileClose(&file); }
};
using OpenFile = std::unique_ptr<RcfFile, FileCloser>;

// Items 21 and 22 follow only when size parameter 6 is 1.
bool hasTailItems(const CVreHandle& h) { return h.n6 == 1; }

// ---- Writing ----------------------------------------------------------------------

class Writer {
public:
    Writer(FileHandle file, CVreHandle& handle) : f_(file), h_(handle) {}

    void putInt(std::int32_t value) { rcfLrecWrite(f_, RCF_INT4, 1, &value); }

    // Writes exactly count elements; a buffer made before the size parameters
    // changed is cut or padded with zeros so that the file stays readable.
    template <class T>
    void putArray(std::int32_t type, const CVreHandle::CVectorItem<T>& item, std::int64_t count) {
        if (count <= 0) return;  // a record of zero elements is never written
        const T* data = item.data();
        std::unique_ptr<T[]> resized;
        if (item.size() != count) {
            resized = std::make_unique<T[]>(static_cast<std::size_t>(count));
            const std::int64_t kept = std::min<std::int64_t>(item.size(), count);
            if (kept > 0) std::memcpy(resized.get(), data, static_cast<std::size_t>(kept) * sizeof(T));
            data = resized.get();
        }
        rcfLrecWrite(f_, type, static_cast<std::uint32_t>(count * recordElements<T>()), data);
    }

    void putGroup(std::int32_t index) {
        const CVreHandle::DoubleItem& item = *h_.vectorItem(index);
        putInt(index);
        putInt(item.unit);
        putArray(RCF_DOUBLE, item, h_.elementCount(index));
    }

    void putScalar(std::int32_t index) {
        const CVreHandle::CScalarItem& item = *h_.scalarItem(index);
        putInt(index);
        putInt(item.unit);
        rcfLrecWrite(f_, RCF_DOUBLE, 1, &item.value);
    }

    void putGroups(std::int32_t first, std::int32_t last) {
        for (std::int32_t i = first; i <= last; ++i) putGroup(i);
    }

    void putAll() {
        putInt(h_.n0);
        putGroup(0);
        putInt(h_.n5);
        putInt(h_.bodies);
        putArray(RCF_BYTE, h_.names, h_.nameCount());
        putGroups(16, 20);
        rcfLrecWrite(f_, RCF_INT4, 2, h_.symmetry);
        putInt(h_.n3);
        putArray(RCF_INT4, h_.panelCounts, h_.bodyCount());
        putGroups(1, 4);
        putInt(h_.n4);
        putScalar(0);
        putScalar(1);
        putGroups(5, 15);
        putInt(h_.n6);
        if (hasTailItems(h_)) {
            putInt(h_.n7);
            putGroups(21, 22);
        }
    }

private:
    FileHandle f_;
    CVreHandle& h_;
};

// Makes every buffer the file needs before anything is created, so that a size
// that cannot be held fails with nothing on disk touched.
template <class T>
bool prepare(CVreHandle::CVectorItem<T>& item, std::int64_t count) {
    return count >= 0 && item.buffer(count) != nullptr;
}

bool prepareAll(CVreHandle& h) {
    const std::int32_t items = hasTailItems(h) ? VRE_VECTOR_ITEMS : VRE_VECTOR_ITEMS - 2;
    for (std::int32_t i = 0; i < items; ++i) {
        if (!prepare(*h.vectorItem(i), h.elementCount(i))) return false;
    }
    return prepare(h.names, h.nameCount()) && prepare(h.panelCounts, h.bodyCount());
}

// ---- Reading ----------------------------------------------------------------------

class Reader {
public:
    Reader(FileHandle file, CVreHandle& handle, std::int64_t fileSize)
        : f_(file), h_(handle), fileSize_(fileSize) {}

    // Each step does nothing once a step has failed.
    void getInt(std::int32_t& target) {
        std::int32_t value = 0;
        if (ok_ && rcfLrecRead(f_, RCF_INT4, 1, &value) == 1) {
            target = value;
        } else {
            ok_ = false;
        }
    }

    // Reads up to count elements into the item's buffer, made at count
    // elements. No record is read for an empty item (none was written).
    template <class T>
    void getArray(std::int32_t type, CVreHandle::CVectorItem<T>& item, std::int64_t count) {
        if (!ok_) return;
        if (count < 0 || count * static_cast<std::int64_t>(sizeof(T)) > remaining() ||
            item.buffer(count) == nullptr) {
            ok_ = false;
            return;
        }
        const std::uint32_t capacity = static_cast<std::uint32_t>(item.size()) * recordElements<T>();
        if (capacity == 0) return;
        if (rcfLrecRead(f_, type, capacity, item.data()) == 0) ok_ = false;
    }

    void getGroup(std::int32_t index) {
        CVreHandle::DoubleItem& item = *h_.vectorItem(index);
        std::int32_t field = 0;
        getInt(field);  // the item index, not checked
        getInt(field);  // the storage unit
        if (!ok_) return;
        if (qtyItemUnitEqv(item.key, field)) item.unit = field;
        getArray(RCF_DOUBLE, item, h_.elementCount(index));
    }

    void getScalar(std::int32_t index) {
        CVreHandle::CScalarItem& item = *h_.scalarItem(index);
        std::int32_t field = 0;
        getInt(field);
        getInt(field);
        if (!ok_) return;
        if (qtyItemUnitEqv(item.key, field)) item.unit = field;
        double value = 0.0;
        if (rcfLrecRead(f_, RCF_DOUBLE, 1, &value) == 1) {
            item.value = value;
        } else {
            ok_ = false;
        }
    }

    void getGroups(std::int32_t first, std::int32_t last) {
        for (std::int32_t i = first; i <= last; ++i) getGroup(i);
    }

    void getSymmetry() {
        std::int32_t pair[2] = {h_.symmetry[0], h_.symmetry[1]};
        if (!ok_) return;
        const std::uint32_t n = rcfLrecRead(f_, RCF_INT4, 2, pair);
        if (n == 0) {
            ok_ = false;
            return;
        }
        std::copy(pair, pair + n, h_.symmetry);
    }

    void getPanelCounts() {
        getArray(RCF_INT4, h_.panelCounts, h_.bodyCount());
        h_.recomputePanelTotal();
    }

    void getAll(std::uint32_t version) {
        getInt(h_.n0);
        getGroup(0);
        if (version == kVersionWritten) getInt(h_.n5);
        getInt(h_.bodies);
        if (version == kVersionWritten) {
            getArray(RCF_BYTE, h_.names, h_.nameCount());
            getGroups(16, 20);
        }
        getSymmetry();
        getInt(h_.n3);
        getPanelCounts();
        getGroups(1, 4);
        getInt(h_.n4);
        getScalar(0);
        getScalar(1);
        getGroups(5, 14);
        getGroup(15);
        if (version != kVersionWritten) return;
        getInt(h_.n6);
        if (ok_ && hasTailItems(h_)) {
            getInt(h_.n7);
            getGroups(21, 22);
        }
    }

private:
    // Bytes left in the file after the logical position.
    std::int64_t remaining() const {
        const std::int64_t at = rcfTell64(f_);
        return at < 0 ? 0 : std::max<std::int64_t>(fileSize_ - at, 0);
    }

    FileHandle f_;
    CVreHandle& h_;
    std::int64_t fileSize_;
    bool ok_ = true;
};

}  // namespace

std::int32_t vreWriteFile(const char* path, CVreHandle& handle) {
    if (!prepareAll(handle)) return F_ERR_MEMORY;
    FileHandle created = nullptr;
    const std::int32_t status = rcfFileOpenCreate(path, "", &created, vreAppIdent, 0);
    if (status != F_NO_ERROR) return status;
    OpenFile file(created);
    Writer(file.get(), handle).putAll();
    const std::int32_t writeStatus = rcfGetError(file.get());
    FileHandle closing = file.release();
    const std::int32_t closeStatus = rcfFileClose(&closing);
    return writeStatus != F_NO_ERROR ? writeStatus : closeStatus;
}

std::int32_t vreReadFile(const char* path, CVreHandle& handle) {
    FileHandle opened = nullptr;
    std::uint32_t appTag = 0;
    const std::int32_t status = rcfFileOpenRead(path, &opened, vreAppIdent, &appTag);
    if (status != F_NO_ERROR) return status;
    OpenFile file(opened);
    const std::uint32_t version = rcfGetVersionCreateApp(file.get());
    if (version == kVersionWritten || version == kVersionOld) {
        std::error_code ec;
        const std::uintmax_t size = std::filesystem::file_size(path, ec);
        const std::int64_t fileSize = ec ? 0 : static_cast<std::int64_t>(std::min<std::uintmax_t>(size, INT64_MAX));
        Reader(file.get(), handle, fileSize).getAll(version);
    }
    return F_NO_ERROR;
}
