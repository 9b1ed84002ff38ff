// Helpers shared by the fuzz targets: an in-memory file with a path that the
// library's C streams can open (a memfd seen through /proc/self/fd), and
// checks that end the run with a crash report when an invariant breaks.
#pragma once

#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <string>

#include <sys/mman.h>
#include <unistd.h>

namespace fuzz {

// A file in memory, rewritten for every input. Each open of path() through
// fopen gets its own position, exactly like a file on disk.
class MemFile {
public:
    explicit MemFile(const char* name) : fd_(memfd_create(name, MFD_CLOEXEC)) {
        if (fd_ < 0) {
            std::perror("memfd_create");
            std::abort();
        }
        path_ = "/proc/self/fd/" + std::to_string(fd_);
    }
    ~MemFile() { close(fd_); }
    MemFile(const MemFile&) = delete;
    MemFile& operator=(const MemFile&) = delete;

    const char* path() const { return path_.c_str(); }

    void assign(const uint8_t* data, size_t size) {
        if (ftruncate(fd_, 0) != 0) std::abort();
        size_t done = 0;
        while (done < size) {
            const ssize_t n = pwrite(fd_, data + done, size - done, static_cast<off_t>(done));
            if (n <= 0) std::abort();
            done += static_cast<size_t>(n);
        }
    }

private:
    int fd_;
    std::string path_;
};

// An invariant of the library failed: report it as a crash of this input.
[[noreturn]] inline void broken(const char* what) {
    std::fprintf(stderr, "invariant broken: %s\n", what);
    std::abort();
}

// Folds bytes into a value the optimiser cannot drop, so that every byte
// handed out by the library is really read (and checked by ASan).
inline uint64_t touch(const void* data, size_t bytes) {
    const auto* p = static_cast<const unsigned char*>(data);
    uint64_t sum = 0;
    for (size_t i = 0; i < bytes; ++i) sum = sum * 31 + p[i];
    return sum;
}
inline volatile uint64_t g_sink = 0;
inline void keep(uint64_t value) { g_sink = g_sink + value; }

}  // namespace fuzz
