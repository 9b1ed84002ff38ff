// Gridded data-file layer: the vector kernels of the statistics' extremes
// scan. On x86-64 with GCC or Clang the float and double scans run on
// AVX-512 or AVX2, chosen once from what the processor offers; anywhere else,
// and for short arrays, the portable scan does the work. All give the same
// results: delete values are counted and never taken as extremes, a NaN
// counts as a value and never becomes an extreme.
#include "grd/grdextremes.h"

#include <condition_variable>
#include <cstdlib>
#include <memory>
#include <mutex>
#include <thread>
#include <type_traits>

#if defined(__unix__) || defined(__APPLE__)
#include <pthread.h>
#include <signal.h>
#include <unistd.h>
#endif
#if defined(__linux__)
#include <sched.h>
#endif

#if defined(__x86_64__) && (defined(__GNUC__) || defined(__clang__))
#define TOVA_EXTREMES_X86 1
#include <immintrin.h>
#endif

namespace {

// Below this many values the vector set-up costs more than it saves.
constexpr int64_t kShortArray = 64;

template <class T>
GrdExtremes scanPortable(const T* p, int64_t n, T del) {
    return grdScanExtremesScalar(p, n, del, true);
}

#ifdef TOVA_EXTREMES_X86

#define TOVA_AVX512 __attribute__((target("avx512f,popcnt")))
#define TOVA_AVX2 __attribute__((target("avx2")))

// Folds the extremes of the vector lanes, and the values counted among the
// first scanned, into the pass over the tail.
template <class T>
GrdExtremes withLanes(GrdExtremes tail, const T* lo, const T* hi, int64_t lanes, int64_t values, int64_t scanned) {
    for (int64_t j = 0; j < lanes; ++j) {
        tail.min = lo[j] < tail.min ? lo[j] : tail.min;
        tail.max = hi[j] > tail.max ? hi[j] : tail.max;
    }
    tail.values += values;
    tail.deletes += scanned - values;
    return tail;
}

// ---- AVX-512: a compare mask picks the lanes that min and max take in. ----

TOVA_AVX512 inline __m512 load512(const float* p) { return _mm512_loadu_ps(p); }
TOVA_AVX512 inline __m512d load512(const double* p) { return _mm512_loadu_pd(p); }
TOVA_AVX512 inline __m512 splat512(float v) { return _mm512_set1_ps(v); }
TOVA_AVX512 inline __m512d splat512(double v) { return _mm512_set1_pd(v); }
// Lanes that do not hold the delete value (a NaN among them).
TOVA_AVX512 inline __mmask16 ordinary512(__m512 v, __m512 del) { return _mm512_cmp_ps_mask(v, del, _CMP_NEQ_UQ); }
TOVA_AVX512 inline __mmask8 ordinary512(__m512d v, __m512d del) { return _mm512_cmp_pd_mask(v, del, _CMP_NEQ_UQ); }
// The candidate goes first: on a NaN the second operand, the lane, is kept.
TOVA_AVX512 inline __m512 min512(__m512 lo, __mmask16 k, __m512 v) { return _mm512_mask_min_ps(lo, k, v, lo); }
TOVA_AVX512 inline __m512d min512(__m512d lo, __mmask8 k, __m512d v) { return _mm512_mask_min_pd(lo, k, v, lo); }
TOVA_AVX512 inline __m512 max512(__m512 hi, __mmask16 k, __m512 v) { return _mm512_mask_max_ps(hi, k, v, hi); }
TOVA_AVX512 inline __m512d max512(__m512d hi, __mmask8 k, __m512d v) { return _mm512_mask_max_pd(hi, k, v, hi); }
// The lanes of both registers, merged (all-lane masks: GCC 12 warns falsely
// about the unmasked forms).
TOVA_AVX512 inline void storeMin512(float* out, __m512 a, __m512 b) {
    _mm512_storeu_ps(out, _mm512_mask_min_ps(a, 0xFFFF, a, b));
}
TOVA_AVX512 inline void storeMin512(double* out, __m512d a, __m512d b) {
    _mm512_storeu_pd(out, _mm512_mask_min_pd(a, 0xFF, a, b));
}
TOVA_AVX512 inline void storeMax512(float* out, __m512 a, __m512 b) {
    _mm512_storeu_ps(out, _mm512_mask_max_ps(a, 0xFFFF, a, b));
}
TOVA_AVX512 inline void storeMax512(double* out, __m512d a, __m512d b) {
    _mm512_storeu_pd(out, _mm512_mask_max_pd(a, 0xFF, a, b));
}

template <class T>
TOVA_AVX512 GrdExtremes scan512(const T* p, int64_t n, T del) {
    constexpr int64_t kWidth = 64 / sizeof(T);
    const auto vdel = splat512(del);
    auto lo0 = splat512(std::numeric_limits<T>::infinity());
    auto hi0 = splat512(-std::numeric_limits<T>::infinity());
    auto lo1 = lo0;
    auto hi1 = hi0;
    int64_t values = 0;
    int64_t i = 0;
    for (; i + 2 * kWidth <= n; i += 2 * kWidth) {
        const auto a = load512(p + i);
        const auto b = load512(p + i + kWidth);
        const auto ka = ordinary512(a, vdel);
        const auto kb = ordinary512(b, vdel);
        values += __builtin_popcount(ka) + __builtin_popcount(kb);
        lo0 = min512(lo0, ka, a);
        lo1 = min512(lo1, kb, b);
        hi0 = max512(hi0, ka, a);
        hi1 = max512(hi1, kb, b);
    }
    T lo[kWidth], hi[kWidth];
    storeMin512(lo, lo0, lo1);
    storeMax512(hi, hi0, hi1);
    return withLanes(scanPortable(p + i, n - i, del), lo, hi, kWidth, values, i);
}

// ---- AVX2: a delete value becomes +inf for the minimum, -inf for the
// maximum, and is counted by subtracting its all-ones compare lane. ----

TOVA_AVX2 inline __m256 load256(const float* p) { return _mm256_loadu_ps(p); }
TOVA_AVX2 inline __m256d load256(const double* p) { return _mm256_loadu_pd(p); }
TOVA_AVX2 inline __m256 splat256(float v) { return _mm256_set1_ps(v); }
TOVA_AVX2 inline __m256d splat256(double v) { return _mm256_set1_pd(v); }
TOVA_AVX2 inline __m256 deleted256(__m256 v, __m256 del) { return _mm256_cmp_ps(v, del, _CMP_EQ_OQ); }
TOVA_AVX2 inline __m256d deleted256(__m256d v, __m256d del) { return _mm256_cmp_pd(v, del, _CMP_EQ_OQ); }
// m ? a : b per lane.
TOVA_AVX2 inline __m256 select256(__m256 m, __m256 a, __m256 b) { return _mm256_blendv_ps(b, a, m); }
TOVA_AVX2 inline __m256d select256(__m256d m, __m256d a, __m256d b) { return _mm256_blendv_pd(b, a, m); }
TOVA_AVX2 inline __m256i count256(__m256i c, __m256 m) { return _mm256_sub_epi32(c, _mm256_castps_si256(m)); }
TOVA_AVX2 inline __m256i count256(__m256i c, __m256d m) { return _mm256_sub_epi64(c, _mm256_castpd_si256(m)); }
TOVA_AVX2 inline __m256 min256(__m256 v, __m256 lo) { return _mm256_min_ps(v, lo); }
TOVA_AVX2 inline __m256d min256(__m256d v, __m256d lo) { return _mm256_min_pd(v, lo); }
TOVA_AVX2 inline __m256 max256(__m256 v, __m256 hi) { return _mm256_max_ps(v, hi); }
TOVA_AVX2 inline __m256d max256(__m256d v, __m256d hi) { return _mm256_max_pd(v, hi); }
TOVA_AVX2 inline void store256(float* out, __m256 v) { _mm256_storeu_ps(out, v); }
TOVA_AVX2 inline void store256(double* out, __m256d v) { _mm256_storeu_pd(out, v); }

// The lane counts are 32-bit for floats: a record holds fewer than 2^30.
template <class T>
TOVA_AVX2 GrdExtremes scan256(const T* p, int64_t n, T del) {
    constexpr int64_t kWidth = 32 / sizeof(T);
    using Count = std::conditional_t<sizeof(T) == 4, int32_t, int64_t>;
    const auto vdel = splat256(del);
    const auto high = splat256(std::numeric_limits<T>::infinity());
    const auto low = splat256(-std::numeric_limits<T>::infinity());
    auto lo0 = high, lo1 = high, hi0 = low, hi1 = low;
    __m256i deletes0 = _mm256_setzero_si256();
    __m256i deletes1 = _mm256_setzero_si256();
    int64_t i = 0;
    for (; i + 2 * kWidth <= n; i += 2 * kWidth) {
        const auto a = load256(p + i);
        const auto b = load256(p + i + kWidth);
        const auto ma = deleted256(a, vdel);
        const auto mb = deleted256(b, vdel);
        deletes0 = count256(deletes0, ma);
        deletes1 = count256(deletes1, mb);
        lo0 = min256(select256(ma, high, a), lo0);
        lo1 = min256(select256(mb, high, b), lo1);
        hi0 = max256(select256(ma, low, a), hi0);
        hi1 = max256(select256(mb, low, b), hi1);
    }
    T lo[kWidth], hi[kWidth];
    Count counts[kWidth];
    store256(lo, min256(lo0, lo1));
    store256(hi, max256(hi0, hi1));
    if constexpr (sizeof(T) == 4) {
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(counts), _mm256_add_epi32(deletes0, deletes1));
    } else {
        _mm256_storeu_si256(reinterpret_cast<__m256i*>(counts), _mm256_add_epi64(deletes0, deletes1));
    }
    int64_t laneDeletes = 0;
    for (int64_t j = 0; j < kWidth; ++j) laneDeletes += counts[j];
    return withLanes(scanPortable(p + i, n - i, del), lo, hi, kWidth, i - laneDeletes, i);
}

template <class T>
using Scan = GrdExtremes (*)(const T*, int64_t, T);

template <class T>
Scan<T> chooseScan() {
    __builtin_cpu_init();
    if (__builtin_cpu_supports("avx512f")) return scan512<T>;
    if (__builtin_cpu_supports("avx2")) return scan256<T>;
    return scanPortable<T>;
}

template <class T>
GrdExtremes scan(const T* p, int64_t n, T del) {
    static const Scan<T> chosen = chooseScan<T>();
    return n < kShortArray ? scanPortable(p, n, del) : chosen(p, n, del);
}

#else

template <class T>
GrdExtremes scan(const T* p, int64_t n, T del) {
    return scanPortable(p, n, del);
}

#endif

}  // namespace

GrdExtremes grdScanExtremes(const float* p, int64_t n, float del) noexcept { return scan(p, n, del); }
GrdExtremes grdScanExtremes(const double* p, int64_t n, double del) noexcept { return scan(p, n, del); }

// ---- The scan beside the write --------------------------------------------------------------

namespace {

// Processors this process may run on: a process bound to one (a rank of a
// parallel model pinned to its core) would only share it with the helper.
unsigned usableProcessors() noexcept {
#if defined(__linux__)
    cpu_set_t set;
    CPU_ZERO(&set);
    if (sched_getaffinity(0, sizeof set, &set) == 0) return static_cast<unsigned>(CPU_COUNT(&set));
#endif
    return std::thread::hardware_concurrency();
}

bool besideAllowed() noexcept {
    static const bool allowed = std::getenv("TOVA_NO_THREADS") == nullptr && usableProcessors() > 1;
    return allowed;
}

}  // namespace

// The helper: one thread for the whole process, started at the first large
// scan and parked on a condition variable between scans. It takes one scan
// at a time; a caller that finds it busy scans itself. It is never joined:
// it lives (parked) until the process ends, its state is never freed, and
// the shared library is marked never to be unloaded, so no exit or unload
// order can pull anything from under it.
class GrdExtremesHelper {
public:
    // The process's helper, started on first use; null when it cannot be.
    static GrdExtremesHelper* instance() noexcept {
        static GrdExtremesHelper* const helper = start();
        // A child made by fork has no helper thread: it scans itself.
        if (helper != nullptr && !helper->inCreatorProcess()) return nullptr;
        return helper;
    }

    bool tryHandOver(GrdExtremesBeside* scan) noexcept {
        std::lock_guard<std::mutex> lock(mutex_);
        if (job_ != nullptr) return false;
        job_ = scan;
        wake_.notify_one();
        return true;
    }

    void waitFor(GrdExtremesBeside* scan) noexcept {
        std::unique_lock<std::mutex> lock(mutex_);
        done_.wait(lock, [scan] { return scan->finished_; });
    }

private:
    GrdExtremesHelper() = default;

    static GrdExtremesHelper* start() noexcept {
        std::unique_ptr<GrdExtremesHelper> helper;
        try {
            helper.reset(new GrdExtremesHelper);
        } catch (...) {
            return nullptr;
        }
#if defined(__unix__) || defined(__APPLE__)
        helper->pid_ = getpid();
        // Signals meant for the process stay with the caller's threads: the
        // helper starts with all of them blocked and keeps that mask.
        sigset_t all;
        sigset_t previous;
        sigfillset(&all);
        const bool masked = pthread_sigmask(SIG_SETMASK, &all, &previous) == 0;
#endif
        bool started = false;
        try {
            std::thread(&GrdExtremesHelper::loop, helper.get()).detach();
            started = true;
        } catch (...) {
        }
#if defined(__unix__) || defined(__APPLE__)
        if (masked) pthread_sigmask(SIG_SETMASK, &previous, nullptr);
#endif
        // Once the thread runs, its state lives as long as the process.
        return started ? helper.release() : nullptr;
    }

    bool inCreatorProcess() const noexcept {
#if defined(__unix__) || defined(__APPLE__)
        return getpid() == pid_;
#else
        return true;
#endif
    }

    [[noreturn]] void loop() noexcept {
        std::unique_lock<std::mutex> lock(mutex_);
        for (;;) {
            wake_.wait(lock, [this] { return job_ != nullptr; });
            GrdExtremesBeside* scan = job_;
            lock.unlock();
            scan->run();
            lock.lock();
            scan->finished_ = true;
            job_ = nullptr;
            done_.notify_all();
        }
    }

    std::mutex mutex_;
    std::condition_variable wake_;
    std::condition_variable done_;
    GrdExtremesBeside* job_ = nullptr;  // the scan under way, null when idle
#if defined(__unix__) || defined(__APPLE__)
    pid_t pid_ = 0;
#endif
};

bool GrdExtremesBeside::worthwhile(int64_t bytes) noexcept { return bytes >= kMinBytes && besideAllowed(); }

GrdExtremesBeside::GrdExtremesBeside(const float* p, int64_t n, float del) noexcept
    : p_(p), n_(n), del_(del), isFloat_(true) {
    start();
}

GrdExtremesBeside::GrdExtremesBeside(const double* p, int64_t n, double del) noexcept
    : p_(p), n_(n), del_(del), isFloat_(false) {
    start();
}

GrdExtremesBeside::~GrdExtremesBeside() {
    if (handedOver_ && !done_) helper_->waitFor(this);
}

void GrdExtremesBeside::run() noexcept {
    out_ = isFloat_ ? grdScanExtremes(static_cast<const float*>(p_), n_, static_cast<float>(del_))
                    : grdScanExtremes(static_cast<const double*>(p_), n_, del_);
}

void GrdExtremesBeside::start() noexcept {
    if (!worthwhile(n_ * (isFloat_ ? 4 : 8))) return;
    GrdExtremesHelper* helper = GrdExtremesHelper::instance();
    handedOver_ = helper != nullptr && helper->tryHandOver(this);
    helper_ = helper;
}

GrdExtremes GrdExtremesBeside::result() noexcept {
    if (done_) return out_;
    if (handedOver_) {
        helper_->waitFor(this);
    } else {
        run();
    }
    done_ = true;
    return out_;
}
