// VRE files, internal interface: the handle class behind a VreHandle with its
// item classes, the element-count rules and the file reader and writer.
#pragma once

#include <cstdint>
#include <memory>
#include <new>

#include "tova/vre.h"

class CVreHandle {
public:
    // Base of every item: the quantity key, the unit its values are stored in,
    // the conversion mode applied on get and set, and the explicit user unit.
    class CItem {
    public:
        explicit CItem(std::int32_t itemKey);
        virtual ~CItem() = default;
        CItem(const CItem&) = delete;
        CItem& operator=(const CItem&) = delete;

        // 0, or 2020 when unit does not belong to the quantity.
        std::int32_t setStorageUnit(std::int32_t newUnit);
        std::int32_t setConversion(std::int32_t newMode, std::int32_t newUserUnit);

        // Storage unit -> caller's unit (get) and back (set), by the mode.
        double toCaller(double value) const;
        double fromCaller(double value) const;
        void toCaller(double* values, std::int32_t count) const;
        void fromCaller(double* values, std::int32_t count) const;

        std::int32_t key;
        std::int32_t unit;
        std::int32_t mode = VRE_CONVERT_NONE;
        std::int32_t userUnit;

    private:
        std::int32_t baseUnit() const;
    };

    class CScalarItem : public CItem {
    public:
        CScalarItem(std::int32_t itemKey, double initial) : CItem(itemKey), value(initial) {}
        ~CScalarItem() override = default;
        double value;
    };

    // An array item. Its buffer is made once, zero-filled, at the length asked
    // for first, and never resized.
    template <class T>
    class CVectorItem : public CItem {
    public:
        explicit CVectorItem(std::int32_t itemKey) : CItem(itemKey) {}
        ~CVectorItem() override = default;

        bool hasBuffer() const { return made_; }
        std::int32_t size() const { return count_; }
        T* data() { return buf_.get(); }
        const T* data() const { return buf_.get(); }

        // The buffer, made at count elements when there is none yet. Null when
        // count is negative (an invalid size) or the allocation fails.
        T* buffer(std::int64_t count) {
            if (made_) return buf_.get();
            if (count < 0 || count > kMaxElements) return nullptr;
            try {
                buf_ = std::make_unique<T[]>(static_cast<std::size_t>(count));
            } catch (const std::bad_alloc&) {
                return nullptr;
            }
            count_ = static_cast<std::int32_t>(count);
            made_ = true;
            return buf_.get();
        }

    private:
        std::unique_ptr<T[]> buf_;
        std::int32_t count_ = 0;
        bool made_ = false;
    };

    using Name = char[VRE_NAME_LENGTH];
    using DoubleItem = CVectorItem<double>;

    // Largest element count of one item: the unit library converts arrays of
    // 32-bit counts, and a record holds at most 2^32 - 1 elements.
    static constexpr std::int64_t kMaxElements = INT32_MAX;

    CVreHandle();
    virtual ~CVreHandle() = default;
    CVreHandle(const CVreHandle&) = delete;
    CVreHandle& operator=(const CVreHandle&) = delete;

    // Null for an index outside the item or parameter range.
    DoubleItem* vectorItem(std::int32_t index);
    CScalarItem* scalarItem(std::int32_t index);
    std::int32_t* param(std::int32_t index);

    // Element count that the size parameters give now; -1 when a factor is
    // negative or the product exceeds kMaxElements.
    std::int64_t elementCount(std::int32_t index) const;
    // Lengths of the panel-count and name buffers (in bodies), -1 likewise; the
    // names of all bodies together must fit in kMaxElements bytes.
    std::int64_t bodyCount() const;
    std::int64_t nameCount() const;
    // P := sum of the first B stored panel counts (saturated to 32 bits).
    void recomputePanelTotal();

    // Members in the order of the original handle layout.
    std::int32_t n0 = 0;
    DoubleItem item0{100514};
    CVectorItem<Name> names{999};
    std::int32_t n5 = 0;
    std::int32_t bodies = 0;
    DoubleItem item16{110258}, item17{110258};
    DoubleItem item18{110220}, item19{110220};
    DoubleItem item20{110258};
    std::int32_t panelTotal = 0;
    std::int32_t symmetry[2] = {1, 0};
    std::int32_t n3 = 0;
    CVectorItem<std::int32_t> panelCounts{999};
    DoubleItem item1{100514}, item2{110030}, item3{100514}, item4{110243};
    std::int32_t n4 = 0;
    CScalarItem scalar0{110244, 9.80665};
    CScalarItem scalar1{100280, 0.0};
    DoubleItem item5{100514}, item6{100514}, item7{110245}, item8{110246}, item9{100085}, item10{110247},
        item11{100515}, item12{110248}, item13{110248}, item14{110266}, item15{110250};
    std::int32_t n6 = 0;  // 1: items 21 and 22 are present
    std::int32_t n7 = 0;
    DoubleItem item21{100415}, item22{100144};
};

// Whole-file transfer (vrefile.cpp).
std::int32_t vreReadFile(const char* path, CVreHandle& handle);
std::int32_t vreWriteFile(const char* path, CVreHandle& handle);
