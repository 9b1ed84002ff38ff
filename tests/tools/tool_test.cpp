// Helpers of the tool tests (see tool_test.h).
#include "tool_test.h"

#include <fcntl.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>
#include <cstdlib>
#include <cstring>

#include <fstream>
#include <memory>
#include <regex>
#include <stdexcept>

#include "rcf/rcf_internal.h"
#include "qty/qty.h"
#include "tova/grd.h"
#include "tova/rcf.h"
#include "tova/vre.h"
#include "tova/xfs.h"

extern char** environ;

namespace tooltest {

namespace {

// Exit codes of the sanitizer runtimes in the child, so that a report can
// never pass for the tool's own exit status 1.
constexpr int kAsanExit = 86;
constexpr int kUbsanExit = 87;

std::string withOption(const char* name, const std::string& option) {
    const char* old = std::getenv(name);
    return std::string(name) + "=" + (old != nullptr && *old != '\0' ? std::string(old) + ":" : "") + option;
}

std::string slurp(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

uint32_t acceptAny(uint32_t* version) {
    *version = 0;
    return RCF_ACCEPT_ANY_APP;
}

}  // namespace

bool Run::clean() const {
    return signal == 0 && exitCode >= 0 && exitCode <= 2 && err.find("Sanitizer") == std::string::npos &&
           err.find("runtime error") == std::string::npos;
}

Run runTova(const std::vector<std::string>& args) {
    static testutil::TempDir outputs;
    const std::string outPath = outputs.file("stdout");
    const std::string errPath = outputs.file("stderr");

    std::vector<std::string> argStrings{TOVA_CLI_PATH};
    argStrings.insert(argStrings.end(), args.begin(), args.end());
    std::vector<char*> argv;
    for (std::string& a : argStrings) argv.push_back(a.data());
    argv.push_back(nullptr);

    std::vector<std::string> envStrings;
    for (char** e = environ; *e != nullptr; ++e) {
        if (std::strncmp(*e, "ASAN_OPTIONS=", 13) != 0 && std::strncmp(*e, "UBSAN_OPTIONS=", 14) != 0) {
            envStrings.emplace_back(*e);
        }
    }
    envStrings.push_back(withOption("ASAN_OPTIONS", "exitcode=" + std::to_string(kAsanExit)));
    envStrings.push_back(withOption("UBSAN_OPTIONS", "exitcode=" + std::to_string(kUbsanExit)));
    std::vector<char*> envp;
    for (std::string& e : envStrings) envp.push_back(e.data());
    envp.push_back(nullptr);

    posix_spawn_file_actions_t actions;
    posix_spawn_file_actions_init(&actions);
    posix_spawn_file_actions_addopen(&actions, 0, "/dev/null", O_RDONLY, 0);
    posix_spawn_file_actions_addopen(&actions, 1, outPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    posix_spawn_file_actions_addopen(&actions, 2, errPath.c_str(), O_WRONLY | O_CREAT | O_TRUNC, 0644);
    pid_t pid = 0;
    const int spawned = posix_spawn(&pid, argv[0], &actions, nullptr, argv.data(), envp.data());
    posix_spawn_file_actions_destroy(&actions);
    if (spawned != 0) throw std::runtime_error(std::string("cannot run the tool: ") + std::strerror(spawned));

    int status = 0;
    while (waitpid(pid, &status, 0) < 0) {
    }
    Run run;
    if (WIFEXITED(status)) run.exitCode = WEXITSTATUS(status);
    if (WIFSIGNALED(status)) run.signal = WTERMSIG(status);
    run.out = slurp(outPath);
    run.err = slurp(errPath);
    return run;
}

std::string masked(std::string text, const std::string& path) {
    text = std::regex_replace(text, std::regex(R"(\d{4}-\d\d-\d\d \d\d:\d\d:\d\d)"), "YYYY-MM-DD hh:mm:ss");
    for (size_t at; (at = text.find(path)) != std::string::npos;) text.replace(at, path.size(), "FILE");
    return text;
}

Layout walkLayout(const std::string& path) {
    FileHandle f = nullptr;
    if (rcfFileOpenRead(path.c_str(), &f, acceptAny, nullptr) != 0) throw std::runtime_error("not a record file");
    Layout layout;
    layout.rcfBase = rcfGetRCFbase(f);
    layout.appBase = rcfGetAppBase(f);
    layout.boundaries.push_back(layout.appBase);
    bool inBlock = false;
    for (;;) {
        const int64_t pos = rcfTell64(f);
        uint32_t count = 0;
        const int32_t type = rcfQuery(f, &count);
        if (type == 0) break;
        const int64_t headerLength = type > 0 ? 5 : type == RCF_BLOCK ? 3 : 1;
        layout.headers.emplace_back(pos, pos + headerLength);
        if (type > 0) ++layout.records;
        if (type == RCF_BLOCK) {
            ++layout.blocks;
            inBlock = true;
        }
        rcfSkip(f);
        if (type == RCF_TERMINATOR) inBlock = false;
        if (!inBlock) layout.boundaries.push_back(rcfTell64(f));
    }
    rcfFileClose(&f);
    return layout;
}

void writeVreFile(const std::string& path, const std::string& firstBodyName) {
    struct Free {
        void operator()(VreHandle h) const { vreHandleFree(h); }
    };
    std::unique_ptr<std::remove_pointer_t<VreHandle>, Free> h(vreHandleCreate());
    const int32_t params[][2] = {{0, 1}, {1, 2}, {3, 2}, {4, 1}, {5, 3}, {6, 1}, {7, 2}};
    for (const auto& p : params) vreSetVectorParam(h.get(), p[0], p[1]);
    const int32_t panels[2] = {2, 1};
    vreSetBodyPanelCount(h.get(), panels);
    std::vector<char> names(2 * VRE_NAME_LENGTH, '\0');
    firstBodyName.copy(names.data(), VRE_NAME_LENGTH - 1);
    std::strcpy(names.data() + VRE_NAME_LENGTH, "buoy");
    vreSetBodyNames(h.get(), names.data());
    vreSetSymmetry(h.get(), 0, 1);
    vreSetScalarItem(h.get(), 1, 42.5);
    for (int32_t k = 0; k < VRE_VECTOR_ITEMS; ++k) {
        std::vector<double> values(256);
        for (size_t i = 0; i < values.size(); ++i) values[i] = k + 0.25 * static_cast<double>(i);
        vreSetVectorItem(h.get(), k, values.data());
    }
    if (vreFileWrite(path.c_str(), h.get()) != 0) throw std::runtime_error("cannot write the VRE file");
}

void writeXsecFile(const std::string& path) {
    FileHandle f = nullptr;
    if (xfsFileOpenCreate(path.c_str(), &f) != 0) throw std::runtime_error("cannot create the file");
    const auto write = [&](XsecHandle x) {
        if (x == nullptr || xfsXsecWrite(x, f) != 0) throw std::runtime_error("cannot write a cross section");
        xfsXsecFree(&x);
    };
    XsecHandle x = xfsXsecCreate("River A", 250.0, "left");
    xfsXsecSetNoPrc(x, 2);
    xfsXsecSetNoCoords(x, 2);
    for (int c = 0; c < 6; ++c) x->prc[c][1] = c;
    x->coords[2][0] = 12.5;
    write(x);
    write(xfsXsecCreate("Canal", 0.0, ""));
    x = xfsXsecCreateEx("River A", 100.5, "left", "survey 2019");
    xfsXsecSetNoRaw(x, 3);
    xfsXsecSetNoSel(x, 2);
    for (int i = 0; i < 3; ++i) x->raw[0][i] = i;
    x->rawMark[1][2] = 7;
    x->sel[1] = 2;
    write(x);
    if (xfsFileClose(&f) != 0) throw std::runtime_error("cannot close the file");
}

double gridValue(int32_t t, int32_t n, int32_t e) {
    if (n == 1) return e == 0 || e == 5 ? static_cast<double>(F_DELETE_VALUE_FLOAT) : 0.25 * e + t - 1.0;
    return 10.0 * t - 0.5 * e;
}

void writeGridFile(const std::string& path, int32_t steps) {
    constexpr int32_t kMetre = 20100, kMetrePerSecond = 20700;
    HeaderHandle h = nullptr;
    const auto ok = [](int32_t status, const char* what) {
        if (status != 0) throw std::runtime_error(std::string(what) + ": status " + std::to_string(status));
    };
    ok(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "test basin", "tool tests", 3, 2, F_ITEM_STATS_ELEMENT, &h),
       "header");
    ok(grdSetEqCalendarAxis(h, "2024-03-21", "06:00:00", QTY_UNIT_SECOND, 0.0, 1800.0, 0), "time axis");
    ok(grdSetGeoInfoUTMProj(h, "UTM-32", 9.0, 54.0, 0.0), "projection");
    const int32_t run[3] = {7, 8, 9};
    ok(grdAddCustomBlock(h, RCF_INT4, "run", 3, run), "custom block");
    ok(grdSetItemInfo(h, grdItemD(h, 1), 40101, "level", kMetre, RCF_FLOAT), "item 1");
    ok(grdSetItemAxisEqD2(grdItemD(h, 1), kMetre, 4, 3, 100.0f, 200.0f, 50.0f, 25.0f), "axis 1");
    const double xs[6] = {0.0, 1.0, 3.0, 6.0, 10.0, 15.0};
    ok(grdSetItemInfo(h, grdItemD(h, 2), 40202, "flux", kMetrePerSecond, RCF_DOUBLE), "item 2");
    ok(grdSetItemAxisNeqD1(grdItemD(h, 2), kMetre, 5, xs, 0), "axis 2");

    FileHandle f = nullptr;
    ok(grdFileCreate(path.c_str(), h, &f), "create");
    const auto writeStatic = [&](int32_t quantity, const char* name, int32_t unit, int32_t type, auto axis,
                                 const void* values) {
        ItemHandle s = nullptr;
        ok(grdStaticCreate(&s), "static");
        ok(grdStaticSetHeader(h, s), "static header");
        ok(grdSetItemInfo(h, s, quantity, name, unit, type), "static info");
        ok(axis(s), "static axis");
        ok(grdStaticWrite(s, f, values), "static write");
        grdStaticDestroy(&s);
    };
    float depth[12];
    for (int32_t e = 0; e < 12; ++e) depth[e] = 1.5f + static_cast<float>(e);
    writeStatic(40103, "depth", kMetre, RCF_FLOAT,
                [](ItemHandle s) { return grdSetItemAxisEqD2(s, kMetre, 4, 3, 100.0f, 200.0f, 50.0f, 25.0f); }, depth);
    const int32_t flags[5] = {10, 11, 12, 13, 14};
    writeStatic(QTY_ITEM_UNDEFINED, "flags", 0, RCF_INT4, [](ItemHandle s) { return grdSetItemAxisEqD1(s, 0, 5, 0.0f, 1.0f); },
                flags);

    for (int32_t t = 0; t < steps; ++t) {
        float level[12];
        double flux[5];
        for (int32_t e = 0; e < 12; ++e) level[e] = static_cast<float>(gridValue(t, 1, e));
        for (int32_t e = 0; e < 5; ++e) flux[e] = gridValue(t, 2, e);
        ok(grdWriteItemTimeStep(h, f, 1800.0 * t, level), "step item 1");
        ok(grdWriteItemTimeStep(h, f, 1800.0 * t, flux), "step item 2");
    }
    ok(grdFileClose(h, &f), "close");
    grdHeaderDestroy(&h);
}

void patchBytes(const std::string& path, uint64_t offset, const std::vector<uint8_t>& bytes) {
    std::vector<uint8_t> all = testutil::readBytes(path);
    if (offset + bytes.size() > all.size()) all.resize(offset + bytes.size());
    std::copy(bytes.begin(), bytes.end(), all.begin() + static_cast<std::ptrdiff_t>(offset));
    testutil::writeBytes(path, all);
}

}  // namespace tooltest
