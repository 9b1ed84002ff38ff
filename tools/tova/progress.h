// Progress of a long operation on standard error, by bytes: shown only when
// standard error is a terminal and the work is large (or, for any size, when
// the environment variable TOVA_PROGRESS is "always"); redrawn four times a
// second and cleared at the end.
#pragma once

#include <chrono>
#include <cstdint>

namespace tova_cli {

class Progress {
public:
    // Work below minTotal bytes finishes too fast to be worth a progress line.
    // quietOutput: standard output must not be a terminal either (a command
    // that prints its results there, like dump).
    Progress(const char* label, uint64_t total, uint64_t minTotal = 64ull << 20, bool quietOutput = false);
    ~Progress();
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    // done: bytes of the work done. Cheap enough to call per record: the
    // clock is read every 256 calls or when 4 MiB more are done.
    void update(uint64_t done) {
        if (!shown_) return;
        if ((++calls_ & 255u) != 0 && done < checked_ + (4u << 20)) return;
        checked_ = done;
        draw(done);
    }

private:
    void draw(uint64_t done);

    const char* label_;
    uint64_t total_;
    bool shown_ = false;
    bool drawn_ = false;
    uint32_t calls_ = 0;
    uint64_t checked_ = 0;
    std::chrono::steady_clock::time_point due_;
};

}  // namespace tova_cli
