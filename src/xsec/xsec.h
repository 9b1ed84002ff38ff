// Cross sections, internal interface: the cross-section object behind an
// XsecData handle, the loaded table, search cursors and the process-wide
// registries through which handles from callers are resolved.
//
// Handles come from callers and may be null, freed or foreign. They are never
// dereferenced before the registry of live objects has confirmed them.
#pragma once

#include <cstdint>
#include <deque>
#include <list>
#include <memory>
#include <mutex>
#include <unordered_set>
#include <vector>

#include "rcf/rcf_internal.h"
#include "tova/xfs.h"

class CTDxSec;
struct XsecTable;
using XsecList = std::list<CTDxSec*>;

// File identity: application tag "XFS_" and the format version written.
constexpr uint32_t kXfsFormatVersion = 106;
// The table version before any file was loaded.
constexpr int32_t kXfsVersionNone = 100;
uint32_t xfsAppIdent(uint32_t* version);

// Block tags of one cross section in a file.
enum : uint16_t {
    kXfsKeyBlock = 257,
    kXfsHeaderBlock = 258,
    kXfsRawBlock = 259,
    kXfsSelBlock = 260,
    kXfsPrcBlock = 261,
    kXfsCoordBlock = 262
};

// The four data sets of a cross section.
enum class XsecSet { Raw, Sel, Prc, Coords };

// Key order: names without regard to ASCII letter case, then the key value.
// Returns -1, 0 or +1. Null names order as empty ones.
int xsecKeyOrder(const char* primaryA, const char* secondaryA, double keyA, const char* primaryB,
                 const char* secondaryB, double keyB);

// One cross section. The record is the caller-visible part; everything it
// points at lives on the C heap and is owned here.
class CTDxSec final {
public:
    // From names; a null or empty extra name gives " ". Invalid when a name
    // is null or a copy fails.
    CTDxSec(const char* primaryName, double keyValue, const char* secondaryName, const char* extraName);
    CTDxSec(const char* primaryName, double keyValue, const char* secondaryName);
    // From the records of a key block (null when there was none) and a header
    // block; formatVersion selects the header layout of older files.
    CTDxSec(const LrecNode* keyRecords, const LrecNode* headerRecords, uint32_t formatVersion);
    ~CTDxSec();
    CTDxSec(const CTDxSec&) = delete;
    CTDxSec& operator=(const CTDxSec&) = delete;

    // Called by the loader right after building from file blocks.
    virtual void afterRead();

    // Frees the set and, for n > 0, allocates zero-filled arrays of n
    // elements. Refused (0) when invalid. Returns the new validFlag.
    uint32_t setCount(XsecSet set, uint16_t n);
    // Takes over the data of one data block's records as the set's arrays.
    // A block of the wrong shape makes the object invalid and leaves the
    // arrays as they were. Returns the new validFlag.
    uint32_t takeRecords(XsecSet set, LrecNode* records);

    // The record, or null when invalid.
    XsecData* publicRecord() { return validFlag ? &rec : nullptr; }
    // True when the key order of this against other has the wanted sign.
    bool compareKey(const CTDxSec& other, int wantedSign) const;
    int keyOrder(const CTDxSec& other) const;
    // Appends the blocks of this cross section at the file's position.
    int32_t write(FileHandle file);

    XsecData rec;
    uint32_t blockPosition = 0;  // file position of the header block it came from
    uint32_t validFlag = 0;

    // Place in a loaded table (null for a cross section made by a caller).
    const XsecTable* table = nullptr;
    XsecList::iterator node{};

private:
    void initRecord();
    bool copyNames(const char* primaryName, const char* secondaryName);
    void releaseAll();
    void freeSet(XsecSet set);
    uint32_t checkSet(XsecSet set, uint32_t n);
};

// Search cursor: a position in a table's list. Cursors outlive tables; the
// serial ties one to the table it was made on.
struct CTDxRef {
    virtual ~CTDxRef() = default;
    XsecList::iterator pos{};
    uint64_t tableSerial = 0;  // 0: not on any table
};

// The process-wide owner of every cursor, destroyed when the library is
// unloaded.
class CTDxRefList {
public:
    CTDxRefList() = default;
    virtual ~CTDxRefList();
    CTDxRefList(const CTDxRefList&) = delete;
    CTDxRefList& operator=(const CTDxRefList&) = delete;

    CTDxRef* add();
    bool contains(const CTDxRef* ref) const;
    size_t size() const;

private:
    mutable std::mutex mutex_;
    std::list<CTDxRef*> refs_;
    std::unordered_set<const CTDxRef*> index_;  // membership test for cursors from callers
};
CTDxRefList& xsecCursors();

// A loaded file: cross sections in key order and the file they came from.
// While loading, cross sections are placed in a positional staging sequence
// by bisection (the same probes as over the list, without walking nodes);
// finishLoad() moves them into the list. A table does not change after
// loading, so the positional index serves finds.
struct XsecTable {
    XsecTable();
    ~XsecTable();
    XsecTable(const XsecTable&) = delete;
    XsecTable& operator=(const XsecTable&) = delete;

    // Places sec by the key order, behind any equal keys; returns it.
    CTDxSec* stage(std::unique_ptr<CTDxSec> sec);
    // Moves the staged cross sections into the list and the index.
    void finishLoad();
    // First element not ordered before the key, and whether it equals it.
    XsecList::iterator lowerBound(const char* primaryName, const char* secondaryName, double keyValue,
                                  bool* equal);

    XsecList list;
    std::vector<CTDxSec*> byPosition;  // the list's elements by position
    FileHandle file = nullptr;
    const uint64_t serial;

private:
    size_t upperBound(const CTDxSec& sec) const;
    std::deque<CTDxSec*> staged_;
};

// Registries of live objects. Resolution returns null for anything that is
// not a live object of the library (or whose owner reference was changed).
void xsecRegister(CTDxSec* sec);
void xsecUnregister(CTDxSec* sec);
CTDxSec* xsecResolve(const XsecData* handle);
void xsecTableRegister(XsecTable* table);
void xsecTableUnregister(XsecTable* table);
XsecTable* xsecTableResolve(const XsecTable* table);

// The load behind xfsXsecTableLoad (exceptions pass through).
int32_t xsecTableLoad(const char* path, XsecTable** out, uint32_t flags);
// The process-wide version of the file opened last for loading.
int32_t xsecTableVersion();
