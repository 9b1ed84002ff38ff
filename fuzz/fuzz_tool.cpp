// Fuzz target of the tova tool: the input is a whole file of any kind, run
// through the tool's own commands in-process (tova_cli::run, the code paths
// of the command line) in the order a user meets a damaged file: info, info
// --json, check, dump, stats, repair, check again. Standard output goes to
// /dev/null while the commands run; what they print on standard error stays
// (fuzz/run closes it for the fuzzer).
#include <fcntl.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <initializer_list>
#include <string>
#include <vector>

#include "fuzz_common.h"
#include "tova_cli.h"

namespace {

// Standard output sent to /dev/null while the object lives; the replay test
// that runs this harness keeps its own output.
class QuietStdout {
public:
    QuietStdout() {
        std::fflush(stdout);
        saved_ = dup(STDOUT_FILENO);
        const int null = open("/dev/null", O_WRONLY | O_CLOEXEC);
        if (saved_ < 0 || null < 0 || dup2(null, STDOUT_FILENO) < 0) std::abort();
        close(null);
    }
    ~QuietStdout() {
        std::fflush(stdout);
        dup2(saved_, STDOUT_FILENO);
        close(saved_);
    }
    QuietStdout(const QuietStdout&) = delete;
    QuietStdout& operator=(const QuietStdout&) = delete;

private:
    int saved_ = -1;
};

// Runs `tova ARGS...`; every exit status is 0 (success), 1 (damaged file,
// failed command) or 2 (bad usage, never with these arguments).
int tova(std::initializer_list<const char*> args) {
    std::vector<std::string> words{"tova"};
    words.insert(words.end(), args.begin(), args.end());
    std::vector<char*> argv;
    for (std::string& word : words) argv.push_back(word.data());
    argv.push_back(nullptr);
    const int code = tova_cli::run(static_cast<int>(words.size()), argv.data());
    if (code != 0 && code != 1) fuzz::broken("a command gave an exit status other than 0 or 1");
    return code;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size) {
    static fuzz::MemFile input("fuzz-tool");
    input.assign(data, size);
    const char* path = input.path();
    QuietStdout quiet;
    tova({"info", path});
    tova({"info", path, "--json"});
    const int sound = tova({"check", path});
    tova({"dump", path});
    tova({"stats", path, "--json"});
    tova({"repair", path});
    // Repair never damages a file that the check accepted.
    if (tova({"check", path}) != 0 && sound == 0) fuzz::broken("repair damaged a file that check accepted");
    return 0;
}
