// Progress of a long operation on standard error, shown only when standard
// error is a terminal and the work is large; the line is cleared at the end.
#pragma once

#include <chrono>
#include <cstdint>
#include <cstdio>

#ifdef _WIN32
#include <io.h>
#else
#include <unistd.h>
#endif

namespace tova_cli {

class Progress {
public:
    // Work below minTotal finishes too fast to be worth a progress line.
    Progress(const char* label, uint64_t total, uint64_t minTotal = 64ull << 20)
        : label_(label), total_(total), shown_(total >= minTotal && stderrIsTerminal()) {}
    ~Progress() {
        if (drawn_) std::fprintf(stderr, "\r%*s\r", 40, "");
    }
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    // Cheap enough to call per record: the clock is read every 1024 calls.
    void update(uint64_t done) {
        if (!shown_ || (++calls_ & 1023u) != 0) return;
        const auto now = std::chrono::steady_clock::now();
        // Nothing for work that ends within half a second; then four a second.
        if (now - (drawn_ ? last_ : start_) < std::chrono::milliseconds(drawn_ ? 250 : 500)) return;
        last_ = now;
        drawn_ = true;
        const double percent = total_ != 0 ? 100.0 * static_cast<double>(done) / static_cast<double>(total_) : 100.0;
        std::fprintf(stderr, "\r%s %5.1f%%", label_, percent);
        std::fflush(stderr);
    }

private:
    static bool stderrIsTerminal() {
#ifdef _WIN32
        return _isatty(_fileno(stderr)) != 0;
#else
        return isatty(fileno(stderr)) != 0;
#endif
    }

    const char* label_;
    uint64_t total_;
    bool shown_;
    bool drawn_ = false;
    uint32_t calls_ = 0;
    std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
    std::chrono::steady_clock::time_point last_{};
};

}  // namespace tova_cli
