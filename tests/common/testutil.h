// Shared test helpers: a private temporary folder removed at the end of the
// test, and whole-file byte access.
#pragma once

#include <atomic>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <random>
#include <string>
#include <vector>

// POSIX process services (fork, pipes, resource limits, /proc): the tests
// that need them are built as skipped tests, saying so, where there are none.
#if defined(_WIN32)
#define TOVA_TEST_POSIX 0
#else
#define TOVA_TEST_POSIX 1
#endif
#define TOVA_TEST_SKIP_WITHOUT_POSIX() GTEST_SKIP() << "needs POSIX processes (fork, resource limits)"

namespace testutil {

class TempDir {
public:
    TempDir() {
        // A token per process keeps test programs that run side by side apart.
        static const std::string process = std::to_string(std::random_device{}());
        static std::atomic<int> counter{0};
        path_ = std::filesystem::temp_directory_path() /
                ("tova-test-" + process + "-" + std::to_string(counter++));
        std::filesystem::remove_all(path_);
        std::filesystem::create_directories(path_);
    }
    ~TempDir() {
        std::error_code ec;
        std::filesystem::remove_all(path_, ec);
    }
    TempDir(const TempDir&) = delete;
    TempDir& operator=(const TempDir&) = delete;

    const std::filesystem::path& path() const { return path_; }
    std::string file(const std::string& name) const { return (path_ / name).string(); }

private:
    std::filesystem::path path_;
};

inline std::vector<uint8_t> readBytes(const std::string& file) {
    std::ifstream in(file, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

inline void writeBytes(const std::string& file, const std::vector<uint8_t>& bytes) {
    std::ofstream out(file, std::ios::binary | std::ios::trunc);
    out.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
}

}  // namespace testutil
