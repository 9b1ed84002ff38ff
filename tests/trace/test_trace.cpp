// Call tracing: the line format, indentation, the name stack and the
// process-ending line limit.
#include <gtest/gtest.h>

#include <cstdio>
#include <fstream>
#include <string>

#include "common/testutil.h"
#if TOVA_TEST_POSIX
#include <sys/wait.h>
#include <unistd.h>
#endif
#include "tova/trace.h"

namespace {

// Runs fn with standard output captured and returns what it printed.
template <class Fn>
std::string captured(Fn fn) {
    testing::internal::CaptureStdout();
    fn();
    std::fflush(stdout);
    return testing::internal::GetCapturedStdout();
}

// Empties the name stack left by earlier tests.
void drainNames() {
    while (std::string(GetFunctionName()) != "???") {
    }
}

}  // namespace

TEST(Trace, NestedCallsIndentAndPopInnerFirst) {
    drainNames();
    const std::string out = captured([] {
        DebugEnter("outerCall <%s>", "a.grd");
        DebugEnter("innerCall %d", 7);
        DebugPrint("x=%d", 3);
        DebugExit("[%d]", 0);
        DebugExit("[%d]", 2003);
    });
    EXPECT_EQ(out,
              "->{outerCall <a.grd>\n"
              "  ->{innerCall 7\n"
              "    x=3\n"
              "  <-}innerCall [0]\n"
              "<-}outerCall [2003]\n");
}

TEST(Trace, ExitWithoutEnterPrintsUnknownNameAtColumnZero) {
    drainNames();
    const std::string out = captured([] { DebugExit("[%d]", 5); });
    EXPECT_EQ(out, "<-}??? [5]\n");
    // The indentation stays at 0: the next line starts at column 0.
    EXPECT_EQ(captured([] { DebugPrint("p"); }), "p\n");
}

TEST(Trace, EnterExitAndPrintLeaveStackAndIndentation) {
    drainNames();
    const std::string out = captured([] {
        DebugEnter("fn");
        DebugEnterExit("oneLine %d", 1);
        DebugPrint("text");
        DebugExit("[%d]", 0);
    });
    EXPECT_EQ(out, "->{fn\n  -><-oneLine 1\n  text\n<-}fn [0]\n");
}

TEST(Trace, NameStoreKeepsOnlyTheLeadingIdentifier) {
    drainNames();
    PutFunctionName("grdFileCreate <%s>");
    PutFunctionName("[%d]");
    PutFunctionName("my_fn2(x)");
    EXPECT_STREQ(GetFunctionName(), "my_fn2");
    EXPECT_STREQ(GetFunctionName(), "");
    EXPECT_STREQ(GetFunctionName(), "grdFileCreate");
    EXPECT_STREQ(GetFunctionName(), "???");
}

TEST(Trace, NameStoreNeverOverflows) {
    drainNames();
    const std::string longName(6000, 'n');
    for (int i = 0; i < 150; ++i) PutFunctionName(longName.c_str());
    // Pushes beyond the stack come back as "???"; stored names are cut to fit.
    int unknown = 0, stored = 0;
    for (int i = 0; i < 150; ++i) {
        const std::string name = GetFunctionName();
        if (name == "???")
            ++unknown;
        else
            ++stored;
        EXPECT_LT(name.size(), 5000u);
    }
    EXPECT_EQ(unknown + stored, 150);
    EXPECT_GT(unknown, 0);
    EXPECT_STREQ(GetFunctionName(), "???");
}

TEST(Trace, StringFormsPrintTextLiterally) {
    drainNames();
    const std::string out = captured([] {
        DebugEnterStr("clientFn 100%% done");
        DebugPrintStr("mid");
        DebugEnterExitStr("one");
        DebugExitStr("[0]");
    });
    EXPECT_EQ(out, "->{clientFn 100% done\n  mid\n  -><-one\n<-}clientFn [0]\n");
}

TEST(Trace, PrintnblankIgnoresNonPositiveCounts) {
    EXPECT_EQ(captured([] { printnblank(0); printnblank(-3); printnblank(3); }), "   ");
}

TEST(Trace, DebugFileIOStoresTruthValue) {
    EXPECT_EQ(DebugFileIO(5), 1);
    EXPECT_EQ(DebugFileIO(0), 0);
}

TEST(Trace, LineLimitEndsTheProcess) {
#if !TOVA_TEST_POSIX
    TOVA_TEST_SKIP_WITHOUT_POSIX();
#else
    testutil::TempDir dir;
    const std::string out = dir.file("trace.txt");
    std::fflush(stdout);
    const pid_t pid = fork();
    ASSERT_GE(pid, 0);
    if (pid == 0) {
        if (!std::freopen(out.c_str(), "w", stdout)) _exit(3);
        for (int i = 0; i < 6000; ++i) DebugPrint("line %d", i);
        _exit(0);  // not reached: the limit ends the process first
    }
    int status = 0;
    ASSERT_EQ(waitpid(pid, &status, 0), pid);
    ASSERT_TRUE(WIFEXITED(status));
    EXPECT_EQ(WEXITSTATUS(status), 255);
    std::ifstream in(out);
    std::string line, last;
    int lines = 0;
    while (std::getline(in, line)) {
        ++lines;
        last = line;
    }
    // The lines printed by the parent before forking count too; this test
    // binary prints fewer than 100 of them.
    EXPECT_GE(lines, 4903);
    EXPECT_LE(lines, 5003);
    EXPECT_NE(last.find("Maximum number of lines exceeded. Bye bye"), std::string::npos);
#endif
}
