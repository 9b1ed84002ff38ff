// Replays the fuzz targets' seed corpora and kept findings through the fuzz
// harnesses themselves (built in with renamed entry points). A harness aborts
// on a broken invariant and the sanitizers catch memory errors and leaks, so
// a finding that comes back fails this test in every build, fuzzer or not.
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <filesystem>
#include <string>
#include <vector>

#include "common/testutil.h"

#define TOVA_FUZZ_TARGET(name) extern "C" int name##_one_input(const uint8_t* data, size_t size);
#include "fuzz_targets.inc"
#undef TOVA_FUZZ_TARGET

namespace {

namespace fs = std::filesystem;

struct Target {
    const char* name;
    int (*run)(const uint8_t*, size_t);
};

#define TOVA_FUZZ_TARGET(name) {#name, name##_one_input},
const Target kTargets[] = {
#include "fuzz_targets.inc"
};
#undef TOVA_FUZZ_TARGET

// Files of one folder, in name order (an absent folder has none).
std::vector<fs::path> inputs(const fs::path& folder) {
    std::vector<fs::path> files;
    if (fs::is_directory(folder)) {
        for (const auto& entry : fs::directory_iterator(folder)) {
            if (entry.is_regular_file()) files.push_back(entry.path());
        }
    }
    std::sort(files.begin(), files.end());
    return files;
}

class FuzzReplay : public testing::TestWithParam<Target> {};

TEST_P(FuzzReplay, SeedsAndKeptFindingsRunClean) {
    const fs::path root = TOVA_SOURCE_DIR;
    const Target& target = GetParam();
    const auto seeds = inputs(root / "fuzz" / "corpus" / target.name);
    EXPECT_FALSE(seeds.empty()) << "no seed corpus for " << target.name;
    auto all = seeds;
    const auto findings = inputs(root / "fuzz" / "regressions" / target.name);
    all.insert(all.end(), findings.begin(), findings.end());
    for (const fs::path& file : all) {
        SCOPED_TRACE(file.string());
        const std::vector<uint8_t> bytes = testutil::readBytes(file.string());
        EXPECT_EQ(target.run(bytes.data(), bytes.size()), 0);
    }
    // Truncations of the seeds, at a stride that keeps the test short.
    for (const fs::path& file : seeds) {
        const std::vector<uint8_t> bytes = testutil::readBytes(file.string());
        const size_t stride = bytes.size() / 64 + 1;
        for (size_t cut = 0; cut < bytes.size(); cut += stride) target.run(bytes.data(), cut);
    }
}

INSTANTIATE_TEST_SUITE_P(Targets, FuzzReplay, testing::ValuesIn(kTargets),
                         [](const testing::TestParamInfo<Target>& info) { return std::string(info.param.name); });

}  // namespace
