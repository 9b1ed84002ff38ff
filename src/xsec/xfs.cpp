// Cross-section files: loading a file into a sorted table, searching and
// walking it, the process-wide cursor list and table version, the registries
// that resolve caller handles, and the exported xfs... functions.
//
// A file is a record file tagged "XFS_" whose body is, per cross section, a
// key block (257), a header block (258) and up to four data blocks (259-262).
#include <atomic>
#include <cstring>
#include <iterator>
#include <mutex>
#include <new>
#include <unordered_map>
#include <unordered_set>
#include <utility>

#include "common/capi.h"
#include "xsec/xsec.h"

namespace {

std::atomic<int32_t> g_tableVersion{kXfsVersionNone};

// Live cross sections (by record address) and tables. Never destroyed, so
// that objects freed during static destruction still find them.
struct Registry {
    std::mutex mutex;
    std::unordered_map<const XsecData*, CTDxSec*> sections;
    std::unordered_set<const XsecTable*> tables;
};

Registry& registry() {
    static auto* instance = new Registry;
    return *instance;
}

uint64_t nextTableSerial() {
    static std::atomic<uint64_t> serial{1};
    return serial.fetch_add(1, std::memory_order_relaxed);
}

// A record list read from a file, freed when it goes out of scope.
class RecordList {
public:
    explicit RecordList(LrecNode* list = nullptr) : list_(list) {}
    ~RecordList() { reset(); }
    RecordList(const RecordList&) = delete;
    RecordList& operator=(const RecordList&) = delete;
    RecordList& operator=(RecordList&& other) noexcept {
        if (this != &other) {
            reset();
            list_ = std::exchange(other.list_, nullptr);
        }
        return *this;
    }
    LrecNode* get() const { return list_; }
    void reset() {
        if (list_ != nullptr) rcfLrecListFree(&list_);
    }

private:
    LrecNode* list_;
};

XsecSet dataSetOfTag(uint16_t tag) {
    switch (tag) {
        case kXfsRawBlock: return XsecSet::Raw;
        case kXfsSelBlock: return XsecSet::Sel;
        case kXfsPrcBlock: return XsecSet::Prc;
        default: return XsecSet::Coords;
    }
}

}  // namespace

uint32_t xfsAppIdent(uint32_t* version) {
    if (version != nullptr) *version = kXfsFormatVersion;
    uint32_t tag;
    std::memcpy(&tag, "XFS_", sizeof tag);
    return tag;
}

// ---- Registries -------------------------------------------------------------

void xsecRegister(CTDxSec* sec) {
    Registry& r = registry();
    std::lock_guard lock(r.mutex);
    r.sections.emplace(&sec->rec, sec);
}

void xsecUnregister(CTDxSec* sec) {
    Registry& r = registry();
    std::lock_guard lock(r.mutex);
    r.sections.erase(&sec->rec);
}

CTDxSec* xsecResolve(const XsecData* handle) {
    if (handle == nullptr) return nullptr;
    Registry& r = registry();
    std::lock_guard lock(r.mutex);
    auto it = r.sections.find(handle);
    if (it == r.sections.end()) return nullptr;
    CTDxSec* sec = it->second;
    return sec->rec.owner == sec ? sec : nullptr;
}

void xsecTableRegister(XsecTable* table) {
    Registry& r = registry();
    std::lock_guard lock(r.mutex);
    r.tables.insert(table);
}

void xsecTableUnregister(XsecTable* table) {
    Registry& r = registry();
    std::lock_guard lock(r.mutex);
    r.tables.erase(table);
}

XsecTable* xsecTableResolve(const XsecTable* table) {
    if (table == nullptr) return nullptr;
    Registry& r = registry();
    std::lock_guard lock(r.mutex);
    return r.tables.count(table) != 0 ? const_cast<XsecTable*>(table) : nullptr;
}

// ---- Cursors ----------------------------------------------------------------

CTDxRefList::~CTDxRefList() {
    for (CTDxRef* ref : refs_) delete ref;
}

CTDxRef* CTDxRefList::add() {
    auto ref = std::make_unique<CTDxRef>();
    std::lock_guard lock(mutex_);
    refs_.push_back(ref.get());
    try {
        index_.insert(ref.get());
    } catch (...) {
        refs_.pop_back();
        throw;
    }
    return ref.release();
}

bool CTDxRefList::contains(const CTDxRef* ref) const {
    std::lock_guard lock(mutex_);
    return index_.count(ref) != 0;
}

size_t CTDxRefList::size() const {
    std::lock_guard lock(mutex_);
    return refs_.size();
}

CTDxRefList& xsecCursors() {
    static CTDxRefList list;
    return list;
}

// ---- Table ------------------------------------------------------------------

XsecTable::XsecTable() : serial(nextTableSerial()) {}

XsecTable::~XsecTable() {
    for (CTDxSec* sec : list) delete sec;
    for (CTDxSec* sec : staged_) delete sec;
    if (file != nullptr) rcfFileClose(&file);
}

CTDxSec* XsecTable::stage(std::unique_ptr<CTDxSec> sec) {
    // Files are usually written in key order: appending is the common case,
    // and a new first element (descending files) needs no search either.
    size_t pos = staged_.size();
    if (!staged_.empty() && !sec->compareKey(*staged_.back(), +1))
        pos = staged_.front()->compareKey(*sec, +1) ? 0 : upperBound(*sec);
    staged_.insert(staged_.begin() + static_cast<ptrdiff_t>(pos), sec.get());
    return sec.release();
}

// Bisection for the upper bound: equal keys stay in load order.
size_t XsecTable::upperBound(const CTDxSec& sec) const {
    size_t low = 0;
    size_t high = staged_.size();
    while (low < high) {
        const size_t middle = low + (high - low) / 2;
        if (staged_[middle]->compareKey(sec, +1)) high = middle;
        else low = middle + 1;
    }
    return low;
}

void XsecTable::finishLoad() {
    byPosition.reserve(byPosition.size() + staged_.size());
    while (!staged_.empty()) {
        CTDxSec* sec = staged_.front();
        // If the list cannot grow, sec stays staged and is freed with the table.
        sec->node = list.insert(list.end(), sec);
        sec->table = this;
        staged_.pop_front();
        byPosition.push_back(sec);
    }
}

XsecList::iterator XsecTable::lowerBound(const char* primaryName, const char* secondaryName, double keyValue,
                                         bool* equal) {
    *equal = false;
    if (byPosition.empty()) return list.end();
    auto order = [&](const CTDxSec* sec) {
        return xsecKeyOrder(sec->rec.primaryName, sec->rec.secondaryName, sec->rec.keyValue, primaryName,
                            secondaryName, keyValue);
    };
    size_t low = 0;
    size_t high = byPosition.size() - 1;
    while (low < high) {
        const size_t middle = low + (high - low) / 2;
        if (order(byPosition[middle]) < 0) low = middle + 1;
        else high = middle;
    }
    *equal = order(byPosition[high]) == 0;
    return byPosition[high]->node;
}

// ---- Load -------------------------------------------------------------------

int32_t xsecTableVersion() { return g_tableVersion.load(std::memory_order_relaxed); }

int32_t xsecTableLoad(const char* path, XsecTable** out, uint32_t flags) {
    *out = nullptr;
    auto table = std::make_unique<XsecTable>();
    uint32_t appTag = 0;
    if (int32_t status = rcfFileOpenRead(path, &table->file, xfsAppIdent, &appTag); status != 0) return status;
    FileHandle file = table->file;
    // The format version is the one the file was created with; it selects the
    // header layout of every cross section in it.
    const uint32_t version = rcfGetVersionCreateApp(file);
    g_tableVersion.store(static_cast<int32_t>(version), std::memory_order_relaxed);

    RecordList pendingKey;
    CTDxSec* last = nullptr;
    for (;;) {
        const int64_t position = rcfTell64(file);
        uint32_t records = 0;
        LrecNode* head = nullptr;
        const uint16_t tag = rcfBlockRead(file, &records, &head);
        RecordList block(head);
        const int32_t error = rcfPeekError(file);
        if (tag == 0) {
            // End of file, or something that is not a block: the end of the
            // cross sections. A failing stream is reported.
            if (error == 0 || error == F_EOF || error == F_ERR_SKIP) break;
            return error;
        }
        // A block cut short or holding a malformed record.
        if (error != 0) return error == F_EOF ? F_ERR_SKIP : error;

        switch (tag) {
            case kXfsKeyBlock: pendingKey = std::move(block); break;
            case kXfsHeaderBlock: {
                // A cross section that cannot be made, like an invalid one,
                // ends the load.
                std::unique_ptr<CTDxSec> sec;
                try {
                    sec = std::make_unique<CTDxSec>(pendingKey.get(), block.get(), version);
                } catch (const std::bad_alloc&) {
                    return F_ERR_VALUE;
                }
                pendingKey.reset();
                sec->afterRead();
                if (!sec->validFlag) return F_ERR_VALUE;
                sec->blockPosition = static_cast<uint32_t>(position);
                last = table->stage(std::move(sec));
                break;
            }
            case kXfsRawBlock:
            case kXfsSelBlock:
            case kXfsPrcBlock:
            case kXfsCoordBlock:
                // Data before any header has no owner and is dropped, as are
                // all data sets when only keys are asked for.
                if (last != nullptr && (flags & XFS_LOAD_KEYS_ONLY) == 0)
                    last->takeRecords(dataSetOfTag(tag), block.get());
                break;
            default: break;
        }
    }
    table->finishLoad();
    xsecTableRegister(table.get());
    *out = table.release();
    return 0;
}

// ---- Exported functions -----------------------------------------------------

namespace {

int32_t setCountApi(XsecHandle xsec, XsecSet set, uint32_t count) {
    return tova::guardedValue<int32_t>(0, [&] {
        CTDxSec* sec = xsecResolve(xsec);
        return sec != nullptr ? static_cast<int32_t>(sec->setCount(set, static_cast<uint16_t>(count & 0xFFFFu))) : 0;
    });
}

XsecHandle createApi(const char* primaryName, double keyValue, const char* secondaryName, const char* extraName) {
    return tova::guardedValue<XsecHandle>(nullptr, [&]() -> XsecHandle {
        auto sec = std::make_unique<CTDxSec>(primaryName, keyValue, secondaryName, extraName);
        if (!sec->validFlag) return nullptr;
        return sec.release()->publicRecord();
    });
}

// The handle of the neighbour of xsec in table (step +1 or -1), or null.
XsecHandle neighbourApi(XsecTableHandle table, XsecHandle xsec, int step) {
    return tova::guardedValue<XsecHandle>(nullptr, [&]() -> XsecHandle {
        XsecTable* t = xsecTableResolve(table);
        CTDxSec* sec = xsecResolve(xsec);
        if (t == nullptr || sec == nullptr || sec->table != t) return nullptr;
        auto it = sec->node;
        if (step > 0) {
            if (++it == t->list.end()) return nullptr;
        } else {
            if (it == t->list.begin()) return nullptr;
            --it;
        }
        return (*it)->publicRecord();
    });
}

}  // namespace

extern "C" {

int32_t TOVA_CALL xfsFileOpenCreate(const char* path, FileHandle* out) {
    if (out != nullptr) *out = nullptr;
    if (path == nullptr || out == nullptr) return F_ERR_ARGUMENT;
    return tova::guarded([&] { return rcfFileOpenCreate(path, "", out, xfsAppIdent, 0); });
}

int32_t TOVA_CALL xfsFileClose(FileHandle* handle) { return rcfFileClose(handle); }

int32_t TOVA_CALL xfsGetError(FileHandle handle) { return rcfGetError(handle); }

int32_t TOVA_CALL xfsPeekError(FileHandle handle) { return rcfPeekError(handle); }

int32_t TOVA_CALL xfsXsecTableLoad(const char* path, XsecTableHandle* out, uint32_t flags) {
    if (out != nullptr) *out = nullptr;
    if (path == nullptr || out == nullptr) return F_ERR_ARGUMENT;
    return tova::guarded([&] { return xsecTableLoad(path, out, flags); });
}

void TOVA_CALL xfsXsecTableFree(XsecTableHandle* table) {
    if (table == nullptr) return;
    tova::guarded([&] {
        XsecTable* t = xsecTableResolve(*table);
        *table = nullptr;
        if (t != nullptr) {
            xsecTableUnregister(t);
            delete t;
        }
        return 0;
    });
}

int32_t TOVA_CALL xfsXsecTableVersion(XsecTableHandle /*table*/) { return xsecTableVersion(); }

XsecHandle TOVA_CALL xfsXsecCreate(const char* primaryName, double keyValue, const char* secondaryName) {
    return createApi(primaryName, keyValue, secondaryName, nullptr);
}

XsecHandle TOVA_CALL xfsXsecCreateEx(const char* primaryName, double keyValue, const char* secondaryName,
                                     const char* extraName) {
    return createApi(primaryName, keyValue, secondaryName, extraName);
}

void TOVA_CALL xfsXsecFree(XsecHandle* xsec) {
    if (xsec == nullptr) return;
    tova::guarded([&] {
        CTDxSec* sec = xsecResolve(*xsec);
        // A cross section of a loaded table goes with its table.
        if (sec != nullptr && sec->table != nullptr) return 0;
        *xsec = nullptr;
        delete sec;
        return 0;
    });
}

int32_t TOVA_CALL xfsXsecSetNoCoords(XsecHandle xsec, uint32_t count) {
    return setCountApi(xsec, XsecSet::Coords, count);
}

int32_t TOVA_CALL xfsXsecSetNoPrc(XsecHandle xsec, uint32_t count) { return setCountApi(xsec, XsecSet::Prc, count); }

int32_t TOVA_CALL xfsXsecSetNoRaw(XsecHandle xsec, uint32_t count) { return setCountApi(xsec, XsecSet::Raw, count); }

int32_t TOVA_CALL xfsXsecSetNoSel(XsecHandle xsec, uint32_t count) { return setCountApi(xsec, XsecSet::Sel, count); }

int32_t TOVA_CALL xfsXsecWrite(XsecHandle xsec, FileHandle file) {
    return tova::guarded([&] {
        CTDxSec* sec = xsecResolve(xsec);
        if (sec == nullptr || file == nullptr) return static_cast<int32_t>(F_ERR_ARGUMENT);
        return sec->write(file);
    });
}

XsecHandle TOVA_CALL xfsXsecFind(XsecTableHandle table, const char* primaryName, double keyValue,
                                 const char* secondaryName, XsecCursor* cursor) {
    return tova::guardedValue<XsecHandle>(nullptr, [&]() -> XsecHandle {
        // The cursor is made first, whatever the arguments.
        CTDxRef* ref = nullptr;
        if (cursor != nullptr) {
            *cursor = nullptr;
            ref = xsecCursors().add();
            *cursor = ref;
        }
        XsecTable* t = xsecTableResolve(table);
        if (t == nullptr || primaryName == nullptr || secondaryName == nullptr) return nullptr;
        if (ref != nullptr) {
            ref->tableSerial = t->serial;
            ref->pos = t->list.end();
        }
        XsecList::iterator hit;
        if (*primaryName == '\0' && *secondaryName == '\0' && keyValue == 0.0) {
            // Two empty names and key 0.0: a walk over the whole table.
            hit = t->list.begin();
            if (hit == t->list.end()) return nullptr;
        } else {
            bool equal = false;
            hit = t->lowerBound(primaryName, secondaryName, keyValue, &equal);
            if (!equal) return nullptr;
        }
        if (ref != nullptr) ref->pos = std::next(hit);
        return (*hit)->publicRecord();
    });
}

XsecHandle TOVA_CALL xfsXsecFindNext(XsecTableHandle table, XsecCursor cursor) {
    return tova::guardedValue<XsecHandle>(nullptr, [&]() -> XsecHandle {
        XsecTable* t = xsecTableResolve(table);
        if (t == nullptr || cursor == nullptr || !xsecCursors().contains(cursor) || cursor->tableSerial != t->serial)
            return nullptr;
        if (cursor->pos == t->list.end()) return nullptr;
        CTDxSec* sec = *cursor->pos;
        ++cursor->pos;
        return sec->publicRecord();
    });
}

XsecHandle TOVA_CALL xfsXsecNext(XsecTableHandle table, XsecHandle xsec) { return neighbourApi(table, xsec, +1); }

XsecHandle TOVA_CALL xfsXsecPrev(XsecTableHandle table, XsecHandle xsec) { return neighbourApi(table, xsec, -1); }

}  // extern "C"
