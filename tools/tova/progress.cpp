// Progress lines on standard error (see progress.h).
#include "progress.h"

#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <string>

#include "os.h"

namespace tova_cli {

namespace {

constexpr auto kFirst = std::chrono::milliseconds(500);  // work that ends sooner shows nothing
constexpr auto kEvery = std::chrono::milliseconds(250);

bool forced() {
    const char* value = std::getenv("TOVA_PROGRESS");
    return value != nullptr && std::strcmp(value, "always") == 0;
}

// "12.3 MB", "1.02 GB".
std::string bytesText(uint64_t bytes) {
    char text[32];
    const double b = static_cast<double>(bytes);
    if (b >= 1e9) {
        std::snprintf(text, sizeof(text), "%.2f GB", b / 1e9);
    } else {
        std::snprintf(text, sizeof(text), "%.1f MB", b / 1e6);
    }
    return text;
}

}  // namespace

Progress::Progress(const char* label, uint64_t total, uint64_t minTotal, bool quietOutput)
    : label_(label), total_(total) {
    const bool force = forced();
    shown_ = isTerminal(Stream::Err) && (total >= minTotal || force) && !(quietOutput && isTerminal(Stream::Out));
    due_ = std::chrono::steady_clock::now() + (force ? std::chrono::milliseconds(0) : kFirst);
    if (force) calls_ = 255;  // the first update draws
}

Progress::~Progress() {
    if (drawn_) std::fprintf(stderr, "\r%*s\r", 60, "");
}

void Progress::draw(uint64_t done) {
    const auto now = std::chrono::steady_clock::now();
    if (now < due_) return;
    due_ = now + kEvery;
    drawn_ = true;
    const double percent = total_ != 0 ? 100.0 * static_cast<double>(done) / static_cast<double>(total_) : 100.0;
    std::fprintf(stderr, "\r%s %5.1f%%  %s of %s ", label_, percent, bytesText(done).c_str(),
                 bytesText(total_).c_str());
    std::fflush(stderr);
}

}  // namespace tova_cli
