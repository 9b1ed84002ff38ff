// Workspace helpers: folder creation, host-project variable parsing, shortcuts.
#include <gtest/gtest.h>

#include <cstdlib>
#include <filesystem>
#include <string>

#include "common/testutil.h"
#include "tova/workspace.h"
#include "workspace/workspace_internal.h"

namespace fs = std::filesystem;

TEST(Workspace, CreateFolderMakesEveryMissingParent) {
    testutil::TempDir dir;
    const std::string absolute = dir.file("x/y/z/file.dat");
    EXPECT_EQ(TdCreateFolder(absolute.c_str()), 1);
    EXPECT_TRUE(fs::is_directory(dir.path() / "x/y/z"));
    EXPECT_FALSE(fs::exists(absolute));
    EXPECT_EQ(TdCreateFolder(absolute.c_str()), 1);  // already there

    // Relative paths are taken from the current directory.
    const fs::path before = fs::current_path();
    fs::current_path(dir.path());
    EXPECT_EQ(TdCreateFolder("a/b/c.dat"), 1);
    EXPECT_EQ(TdCreateFolder("a/b/c.dat"), 1);
    EXPECT_EQ(TdCreateFolder("plain.dat"), 1);
    fs::current_path(before);
    EXPECT_TRUE(fs::is_directory(dir.path() / "a/b"));
}

TEST(Workspace, CreateFolderFailsBelowAFile) {
    testutil::TempDir dir;
    testutil::writeBytes(dir.file("blocker"), {1});
    EXPECT_EQ(TdCreateFolder(dir.file("blocker/sub/f.dat").c_str()), 0);
    EXPECT_EQ(TdCreateFolder(nullptr), 0);
    // Long paths are no problem (beyond the Windows shell's 260 characters).
    if (!TOVA_TEST_POSIX) return;
    std::string deep = dir.path().string();
    for (int i = 0; i < 40; ++i) deep += "/folder_with_a_long_name_" + std::to_string(i);
    EXPECT_EQ(TdCreateFolder((deep + "/f.dat").c_str()), 1);
    EXPECT_TRUE(fs::is_directory(deep));
}

TEST(Workspace, ProjectVariableNeedsFourTokensAndANonZeroHexHandle) {
    uintptr_t window = 0;
    EXPECT_TRUE(tdParseProjectWindow("a&b&c&1f", &window));
    EXPECT_EQ(window, 0x1fu);
    EXPECT_TRUE(tdParseProjectWindow("app&&x&y&0xABC", &window));
    EXPECT_EQ(window, 0xabcu);
    EXPECT_FALSE(tdParseProjectWindow("a&b&c&0", &window));
    EXPECT_FALSE(tdParseProjectWindow("a&b&c", &window));
    EXPECT_FALSE(tdParseProjectWindow("a&b&c&zz", &window));
    EXPECT_FALSE(tdParseProjectWindow("", &window));
    EXPECT_FALSE(tdParseProjectWindow(nullptr, &window));
}

TEST(Workspace, ProjectAddFileHasNoHostHere) {
#if !TOVA_TEST_POSIX
    GTEST_SKIP() << "Windows has host windows: the Windows tests send to one";
#else
    ::unsetenv("TDPROJECTXXXXX");
    EXPECT_EQ(TdProject_AddFile("/tmp/a.grd"), -1);
    ::setenv("TDPROJECTXXXXX", "a&b&c&0", 1);
    EXPECT_EQ(TdProject_AddFile("/tmp/a.grd"), -1);
    ::setenv("TDPROJECTXXXXX", "a&b&c&1234", 1);
    EXPECT_EQ(TdProject_AddFile("/tmp/a.grd"), -1);
    ::unsetenv("TDPROJECTXXXXX");
#endif
}

TEST(Workspace, ShortcutsAreRecognisedByExtensionOnly) {
    EXPECT_EQ(TdShortCut_IsShortcut("C:\\x\\file.LNK"), 1);
    EXPECT_EQ(TdShortCut_IsShortcut("file.lnk"), 1);
    EXPECT_EQ(TdShortCut_IsShortcut("file.lnk.txt"), 0);
    EXPECT_EQ(TdShortCut_IsShortcut("lnk"), 0);
    EXPECT_EQ(TdShortCut_IsShortcut(nullptr), 0);

    char target[260] = "unchanged";
    EXPECT_LT(TdShortCut_ResolveShortcut("no-such-file.lnk", target), 0);
    EXPECT_STREQ(target, "");
}
