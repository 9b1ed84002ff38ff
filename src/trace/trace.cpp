// Call tracing: an indented tree of entered and left calls on standard output.
// All state is process-wide. The name store keeps the names of the open calls
// packed in one buffer with a stack of end positions; it never writes outside
// its buffers (a name that does not fit is cut, a push beyond the stack depth
// is counted and answered with "???" when popped). After 5002 lines the
// process ends with status -1, deliberately: a runaway trace must not fill
// the disk.
#include "tova/trace.h"

#include <cctype>
#include <cstdarg>
#include <cstdio>
#include <cstdlib>
#include <cstring>

#include "trace/trace_internal.h"

namespace tova {
std::atomic<int32_t> g_traceApi{0};
std::atomic<int32_t> g_traceFileIo{0};
}  // namespace tova

namespace {

constexpr int kNameBufferSize = 5000;
constexpr int kStackSize = 100;
constexpr int32_t kLineLimit = 5000;

int32_t g_indent = 0;
int32_t g_lines = 0;
char g_names[kNameBufferSize];
char* g_stack[kStackSize];
int32_t g_depth = 0;
int32_t g_lost = 0;  // pushes that did not fit the stack
bool g_firstUse = true;

bool isNameChar(unsigned char c) { return std::isalnum(c) || c == '_' || c >= 0x80; }

// Counts a finished line and ends the process past the limit.
void countLine() {
    const int32_t old = g_lines++;
    if (old > kLineLimit) {
        std::fputs("Maximum number of lines exceeded. Bye bye", stdout);
        std::fflush(stdout);
        std::exit(-1);
    }
}

void printIndent() { printnblank(g_indent); }

// Prints text taken as a format without arguments: only "%%" has a meaning.
void printLiteral(const char* text) {
    for (const char* p = text; *p; ++p) {
        if (p[0] == '%' && p[1] == '%') ++p;
        std::fputc(*p, stdout);
    }
}

void pushName(const char* source) {
    if (source == nullptr) source = "";
    if (g_firstUse) {
        g_firstUse = false;
        g_depth = 0;
        g_stack[0] = g_names;
    }
    if (g_depth >= kStackSize - 1) {
        ++g_lost;
        return;
    }
    char* start = g_stack[g_depth];
    const size_t room = static_cast<size_t>(g_names + kNameBufferSize - 1 - start);
    size_t len = 0;
    while (len < room && source[len] != '\0' && isNameChar(static_cast<unsigned char>(source[len]))) ++len;
    std::memcpy(start, source, len);
    start[len] = '\0';
    ++g_depth;
    g_stack[g_depth] = start + len;
}

const char* popName() {
    if (g_lost > 0) {
        --g_lost;
        return "???";
    }
    if (g_depth < 1) return "???";
    *g_stack[g_depth] = '\0';
    --g_depth;
    return g_stack[g_depth];
}

void enterLine(const char* marker, const char* format, va_list args) {
    printIndent();
    std::fputs(marker, stdout);
    std::vprintf(format, args);
    std::fputc('\n', stdout);
    countLine();
}

}  // namespace

extern "C" {

void DebugEnter(const char* format, ...) {
    pushName(format);
    va_list args;
    va_start(args, format);
    enterLine("->{", format, args);
    va_end(args);
    g_indent += 2;
}

void DebugEnterExit(const char* format, ...) {
    va_list args;
    va_start(args, format);
    enterLine("-><-", format, args);
    va_end(args);
}

int32_t DebugExit(const char* format, ...) {
    g_indent = g_indent >= 2 ? g_indent - 2 : 0;
    const char* name = popName();
    printIndent();
    std::printf("<-}%s ", name);
    va_list args;
    va_start(args, format);
    std::vprintf(format, args);
    va_end(args);
    std::fputc('\n', stdout);
    countLine();
    return g_lines;
}

void DebugPrint(const char* format, ...) {
    printIndent();
    va_list args;
    va_start(args, format);
    std::vprintf(format, args);
    va_end(args);
    std::fputc('\n', stdout);
    countLine();
}

void TOVA_CALL DebugEnterStr(const char* text) {
    if (text == nullptr) text = "";
    pushName(text);
    printIndent();
    std::fputs("->{", stdout);
    printLiteral(text);
    std::fputc('\n', stdout);
    countLine();
    g_indent += 2;
}

void TOVA_CALL DebugEnterExitStr(const char* text) {
    if (text == nullptr) text = "";
    printIndent();
    std::fputs("-><-", stdout);
    printLiteral(text);
    std::fputc('\n', stdout);
    countLine();
}

int32_t TOVA_CALL DebugExitStr(const char* text) {
    if (text == nullptr) text = "";
    g_indent = g_indent >= 2 ? g_indent - 2 : 0;
    const char* name = popName();
    printIndent();
    std::printf("<-}%s ", name);
    printLiteral(text);
    std::fputc('\n', stdout);
    countLine();
    return g_lines;
}

void TOVA_CALL DebugPrintStr(const char* text) {
    if (text == nullptr) text = "";
    printIndent();
    printLiteral(text);
    std::fputc('\n', stdout);
    countLine();
}

void TOVA_CALL PutFunctionName(const char* nameSource) { pushName(nameSource); }

const char* TOVA_CALL GetFunctionName(void) { return popName(); }

void TOVA_CALL printnblank(int32_t count) {
    for (int32_t i = 0; i < count; ++i) std::fputc(' ', stdout);
}

int32_t TOVA_CALL DebugFileIO(int32_t on) {
    const int32_t value = on != 0 ? 1 : 0;
    tova::g_traceFileIo.store(value, std::memory_order_relaxed);
    return value;
}

}  // extern "C"
