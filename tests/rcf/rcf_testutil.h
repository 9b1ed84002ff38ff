// Helpers of the record-layer tests: application callbacks, a handle that
// closes itself, little- and big-endian byte access, a hand-built file in
// the opposite byte order, and running a check in a forked child.
#pragma once

#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <functional>
#include <string>
#include <vector>

#include "common/testutil.h"
#if TOVA_TEST_POSIX
#include <sys/wait.h>
#include <unistd.h>
#endif
#include "rcf/rcf_internal.h"

namespace rcftest {

inline uint32_t tagOf(const char* four) {
    uint32_t tag = 0;
    std::memcpy(&tag, four, 4);
    return tag;
}

inline uint32_t testApp(uint32_t* version) {
    *version = 7;
    return tagOf("TST_");
}
inline uint32_t testAppV9(uint32_t* version) {
    *version = 9;
    return tagOf("TST_");
}
inline uint32_t otherApp(uint32_t* version) {
    *version = 3;
    return tagOf("OTH_");
}
inline uint32_t anyApp(uint32_t* version) {
    *version = 0;
    return RCF_ACCEPT_ANY_APP;
}

constexpr const char* kBanner = " TOVA Deck - this file contains binary data, do not edit";

// Owns an open handle for the length of a test.
class File {
public:
    File() = default;
    ~File() { rcfFileClose(&h_); }
    File(const File&) = delete;
    File& operator=(const File&) = delete;
    FileHandle* out() { return &h_; }
    FileHandle get() const { return h_; }
    operator FileHandle() const { return h_; }  // NOLINT: used as a handle

private:
    FileHandle h_ = nullptr;
};

inline uint16_t le16(const std::vector<uint8_t>& b, size_t at) { return static_cast<uint16_t>(b[at] | b[at + 1] << 8); }
inline uint32_t le32(const std::vector<uint8_t>& b, size_t at) {
    return static_cast<uint32_t>(b[at]) | static_cast<uint32_t>(b[at + 1]) << 8 |
           static_cast<uint32_t>(b[at + 2]) << 16 | static_cast<uint32_t>(b[at + 3]) << 24;
}
inline uint32_t be32(const std::vector<uint8_t>& b, size_t at) {
    return static_cast<uint32_t>(b[at]) << 24 | static_cast<uint32_t>(b[at + 1]) << 16 |
           static_cast<uint32_t>(b[at + 2]) << 8 | static_cast<uint32_t>(b[at + 3]);
}

// Byte strings are built in a std::string (GCC 12 misreads vector growth
// from a small literal as an overflow) and handed out as vectors.
inline void putBE(std::string& b, uint64_t v, int bytes) {
    for (int i = bytes - 1; i >= 0; --i) b.push_back(static_cast<char>(v >> (8 * i)));
}
inline std::vector<uint8_t> toBytes(const std::string& s) { return {s.begin(), s.end()}; }

// A record file written by a machine of the opposite byte order, built byte
// by byte: application "TST_" (version 7 at creation, 6 at the last edit),
// created 2001-02-03 04:05:06 by layer version 104, edited 2002-12-31
// 23:59:58 by 103; then an integer*2 record {1, -2, 300} and a block 0x1234
// holding one double 1.5.
inline std::vector<uint8_t> swappedFile() {
    std::string b = "_ATQ_TST";
    b += kBanner;
    b += '\x1A';
    for (int v : {2001, 2, 3, 4, 5, 6}) putBE(b, static_cast<uint16_t>(v), 2);
    putBE(b, 104, 4);
    putBE(b, 7, 4);
    for (int v : {2002, 12, 31, 23, 59, 58}) putBE(b, static_cast<uint16_t>(v), 2);
    putBE(b, 103, 4);
    putBE(b, 6, 4);
    putBE(b, 0, 8);
    b += '\x06';
    putBE(b, 3, 4);
    for (int v : {1, -2, 300}) putBE(b, static_cast<uint16_t>(v), 2);
    b += '\xFE';
    putBE(b, 0x1234, 2);
    b += '\x02';
    putBE(b, 1, 4);
    double d = 1.5;
    uint64_t bits = 0;
    std::memcpy(&bits, &d, 8);
    putBE(b, bits, 8);
    b += '\xFF';
    return toBytes(b);
}

#if TOVA_TEST_POSIX
// Runs fn in a forked child and returns its result (or -1 when the child
// did not end normally). Used for checks under resource limits.
inline int runInChild(const std::function<int()>& fn) {
    int fds[2];
    if (pipe(fds) != 0) return -1;
    const pid_t pid = fork();
    if (pid == 0) {
        close(fds[0]);
        const int result = fn();
        const ssize_t n = write(fds[1], &result, sizeof(result));
        _exit(n == sizeof(result) ? 0 : 1);
    }
    close(fds[1]);
    int result = -1;
    if (read(fds[0], &result, sizeof(result)) != sizeof(result)) result = -1;
    close(fds[0]);
    int status = 0;
    waitpid(pid, &status, 0);
    return WIFEXITED(status) && WEXITSTATUS(status) == 0 ? result : -1;
}

// Open file descriptors of this process.
inline int openDescriptors() {
    int n = 0;
    for ([[maybe_unused]] const auto& entry : std::filesystem::directory_iterator("/proc/self/fd")) ++n;
    return n;
}
#else
inline int openDescriptors() { return 0; }  // not counted without /proc
#endif

}  // namespace rcftest
