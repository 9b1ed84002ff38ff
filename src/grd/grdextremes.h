// Gridded data-file layer: the extremes scan of the item statistics. The
// global statistics of every time step written pass over all its values, so
// the float and double scans use the widest vector unit of the processor.
#pragma once

#include <cstdint>
#include <limits>

// Extremes over the values that are not the delete value, and the counts.
// With no ordinary value min is +inf (or the type's maximum) and max -inf.
struct GrdExtremes {
    double min;
    double max;
    int64_t values;   // ordinary values (a NaN counts as one and never as an extreme)
    int64_t deletes;  // delete values
};

// The portable scan, for every value type. Eight independent lanes break the
// loop-carried dependencies; comparisons stay in the values' own type and
// only the results are widened.
template <class T>
GrdExtremes grdScanExtremesScalar(const T* p, int64_t n, T del, bool hasDelete) noexcept {
    constexpr int kLanes = 8;
    constexpr T kHigh = std::numeric_limits<T>::has_infinity ? std::numeric_limits<T>::infinity()
                                                             : std::numeric_limits<T>::max();
    constexpr T kLow = std::numeric_limits<T>::has_infinity ? -std::numeric_limits<T>::infinity()
                                                            : std::numeric_limits<T>::lowest();
    // Fewer values than lanes (a scalar item) need no lanes.
    if (n < kLanes) {
        T low = kHigh;
        T high = kLow;
        int64_t dels = 0;
        for (int64_t i = 0; i < n; ++i) {
            const T v = p[i];
            const bool isDelete = hasDelete && v == del;
            dels += isDelete;
            low = (!isDelete && v < low) ? v : low;
            high = (!isDelete && v > high) ? v : high;
        }
        return GrdExtremes{static_cast<double>(low), static_cast<double>(high), n - dels, dels};
    }
    T lo[kLanes];
    T hi[kLanes];
    int64_t deletes[kLanes];
    for (int j = 0; j < kLanes; ++j) {
        lo[j] = kHigh;
        hi[j] = kLow;
        deletes[j] = 0;
    }
    int64_t i = 0;
    for (; i + kLanes <= n; i += kLanes) {
        for (int j = 0; j < kLanes; ++j) {
            const T v = p[i + j];
            const bool isDelete = hasDelete && v == del;
            deletes[j] += isDelete;
            lo[j] = (!isDelete && v < lo[j]) ? v : lo[j];
            hi[j] = (!isDelete && v > hi[j]) ? v : hi[j];
        }
    }
    for (int j = 1; j < kLanes; ++j) {
        lo[0] = lo[j] < lo[0] ? lo[j] : lo[0];
        hi[0] = hi[j] > hi[0] ? hi[j] : hi[0];
        deletes[0] += deletes[j];
    }
    for (; i < n; ++i) {
        const T v = p[i];
        const bool isDelete = hasDelete && v == del;
        deletes[0] += isDelete;
        lo[0] = (!isDelete && v < lo[0]) ? v : lo[0];
        hi[0] = (!isDelete && v > hi[0]) ? v : hi[0];
    }
    return GrdExtremes{static_cast<double>(lo[0]), static_cast<double>(hi[0]), n - deletes[0], deletes[0]};
}

// The same for float and double arrays, on the widest vector unit present.
GrdExtremes grdScanExtremes(const float* p, int64_t n, float del) noexcept;
GrdExtremes grdScanExtremes(const double* p, int64_t n, double del) noexcept;

// The scan of a large float or double array run on the library's helper
// thread, beside the caller writing the same values to the file, so that the
// pass costs the caller (almost) no time where the process may use a second
// processor: handed over by the constructor, waited for by result() (or the
// destructor). It runs on the caller's thread instead, inside result(), when
// the process may use one processor only, the environment sets
// TOVA_NO_THREADS, the helper is busy with another caller's scan, or it
// cannot be started. The array must not change until result() returned.
class GrdExtremesHelper;

class GrdExtremesBeside {
public:
    GrdExtremesBeside(const float* p, int64_t n, float del) noexcept;
    GrdExtremesBeside(const double* p, int64_t n, double del) noexcept;
    ~GrdExtremesBeside();
    GrdExtremesBeside(const GrdExtremesBeside&) = delete;
    GrdExtremesBeside& operator=(const GrdExtremesBeside&) = delete;

    GrdExtremes result() noexcept;
    // Below this size the hand-over (a wake-up of the helper, tens of
    // microseconds on a virtual machine) costs about what the scan would:
    // items of 1 MiB wrote no faster with the helper, items of 2 and 4 MB did.
    static constexpr int64_t kMinBytes = int64_t{2} << 20;
    // Whether a scan of this many bytes is handed to the helper here.
    static bool worthwhile(int64_t bytes) noexcept;
    // Whether the scan was handed to the helper thread.
    bool onHelper() const noexcept { return handedOver_; }

private:
    friend class GrdExtremesHelper;
    void start() noexcept;
    void run() noexcept;

    const void* p_;
    int64_t n_;
    double del_;
    bool isFloat_;
    GrdExtremesHelper* helper_ = nullptr;  // the helper it was handed to
    bool handedOver_ = false;
    bool finished_ = false;  // set by the helper under its lock
    bool done_ = false;
    GrdExtremes out_{};
};
