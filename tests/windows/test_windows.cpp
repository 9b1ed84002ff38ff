// Windows services of the library, through tova.dll and its public headers:
// shell shortcuts opened and deleted through grdFileRead/grdFileDelete, the
// copy-data message to a host project window after a close, a plug-in DLL
// chosen by the data type, and 64-bit positions in a file over 4 GiB.
#include <gtest/gtest.h>

#include <cmath>
#include <cstdint>
#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include <windows.h>
#include <objbase.h>
#include <shlobj.h>

#include "common/testutil.h"
#include "qty/qty.h"
#include "tova/grd.h"
#include "tova/rcf.h"
#include "tova/workspace.h"

namespace {

constexpr int32_t kElements = 6;

// Writes a file of one float item on a 3 x 2 grid (two of them when
// components is set: the velocity components of the example plug-in) with
// two time steps; the header's data type is dataType.
void writeFile(const std::string& path, int32_t dataType = 0, bool components = false) {
    HeaderHandle header = nullptr;
    FileHandle file = nullptr;
    const int32_t items = components ? 2 : 1;
    ASSERT_EQ(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "windows", "test", 1, items, 1, &header), 0);
    ASSERT_EQ(grdSetEqTimeAxis(header, QTY_UNIT_SECOND, 0.0, 60.0, 0), 0);
    ASSERT_EQ(grdSetDataType(header, dataType), 0);
    for (int32_t k = 1; k <= items; ++k) {
        const int32_t type = components ? (k == 1 ? 40202 : 40203) : QTY_ITEM_UNDEFINED;
        const int32_t unit = components ? 20700 : 0;
        ASSERT_EQ(grdSetItemInfo(header, grdItemD(header, k), type, k == 1 ? "u" : "v", unit, 1), 0);
        ASSERT_EQ(grdSetItemAxisEqD2(grdItemD(header, k), 0, 3, 2, 0.0f, 0.0f, 1.0f, 1.0f), 0);
    }
    ASSERT_EQ(grdFileCreate(path.c_str(), header, &file), 0);
    for (int t = 0; t < 2; ++t) {
        for (int32_t k = 1; k <= items; ++k) {
            std::vector<float> values(kElements);
            for (int i = 0; i < kElements; ++i) values[i] = static_cast<float>(k == 1 ? 3 * (i + t) : 4 * (i + t));
            ASSERT_EQ(grdWriteItemTimeStep(header, file, 60.0 * t, values.data()), 0);
        }
    }
    ASSERT_EQ(grdFileClose(header, &file), 0);
    grdHeaderDestroy(&header);
}

// Makes a shell shortcut at link that points at target.
HRESULT makeShortcut(const std::string& link, const std::string& target) {
    IShellLinkA* shell = nullptr;
    HRESULT hr = CoCreateInstance(CLSID_ShellLink, nullptr, CLSCTX_INPROC_SERVER, IID_IShellLinkA,
                                  reinterpret_cast<void**>(&shell));
    if (FAILED(hr)) return hr;
    hr = shell->SetPath(target.c_str());
    if (SUCCEEDED(hr)) hr = shell->SetDescription("tova test");
    IPersistFile* file = nullptr;
    if (SUCCEEDED(hr)) hr = shell->QueryInterface(IID_IPersistFile, reinterpret_cast<void**>(&file));
    if (SUCCEEDED(hr)) {
        std::wstring wide(link.begin(), link.end());
        hr = file->Save(wide.c_str(), TRUE);
        file->Release();
    }
    shell->Release();
    return hr;
}

bool exists(const std::string& path) { return GetFileAttributesA(path.c_str()) != INVALID_FILE_ATTRIBUTES; }

class Windows : public ::testing::Test {
protected:
    void SetUp() override { ASSERT_TRUE(SUCCEEDED(CoInitializeEx(nullptr, COINIT_APARTMENTTHREADED))); }
    void TearDown() override { CoUninitialize(); }
    testutil::TempDir dir_;
};

TEST_F(Windows, ShortcutsAreOpenedAndDeletedThroughTheirTarget) {
    const std::string target = dir_.file("target.grd");
    const std::string link = dir_.file("Target File.LNK");
    writeFile(target);
    ASSERT_EQ(makeShortcut(link, target), S_OK);
    EXPECT_EQ(TdShortCut_IsShortcut(link.c_str()), 1);

    char resolved[MAX_PATH] = "x";
    EXPECT_GE(TdShortCut_ResolveShortcut(link.c_str(), resolved), 0);
    EXPECT_EQ(lstrcmpiA(resolved, target.c_str()), 0) << resolved;

    HeaderHandle header = nullptr;
    FileHandle file = nullptr;
    ASSERT_EQ(grdFileRead(link.c_str(), &header, &file), 0);
    EXPECT_EQ(lstrcmpiA(rcfGetFilename(file), target.c_str()), 0) << rcfGetFilename(file);
    EXPECT_EQ(grdGetNoOfItems(header), 1);
    ASSERT_EQ(grdFileClose(header, &file), 0);
    grdHeaderDestroy(&header);

    // Deleting the shortcut deletes its target, not the shortcut.
    EXPECT_EQ(grdFileDelete(link.c_str()), 0);
    EXPECT_FALSE(exists(target));
    EXPECT_TRUE(exists(link));
    // A shortcut whose target is gone cannot be opened or deleted.
    EXPECT_EQ(grdFileRead(link.c_str(), &header, &file), F_ERR_OPEN);
    EXPECT_EQ(header, nullptr);
    EXPECT_EQ(file, nullptr);
}

// The host project window: records what the copy-data messages carry.
struct Received {
    int messages = 0;
    ULONG_PTR tag = 0;
    std::string text;
};
Received g_received;

LRESULT CALLBACK hostWindowProc(HWND window, UINT message, WPARAM wParam, LPARAM lParam) {
    if (message == WM_COPYDATA) {
        const auto* data = reinterpret_cast<const COPYDATASTRUCT*>(lParam);
        ++g_received.messages;
        g_received.tag = data->dwData;
        g_received.text.assign(static_cast<const char*>(data->lpData), data->cbData);
        return 77;
    }
    return DefWindowProcA(window, message, wParam, lParam);
}

TEST_F(Windows, TheHostProjectWindowHearsOfAClosedFile) {
    WNDCLASSA windowClass{};
    windowClass.lpfnWndProc = hostWindowProc;
    windowClass.hInstance = GetModuleHandleA(nullptr);
    windowClass.lpszClassName = "tovaTestHostProject";
    ASSERT_NE(RegisterClassA(&windowClass), 0);
    HWND window = CreateWindowA("tovaTestHostProject", "host", 0, 0, 0, 0, 0, HWND_MESSAGE, nullptr,
                                windowClass.hInstance, nullptr);
    ASSERT_NE(window, nullptr);
    char value[64];
    std::snprintf(value, sizeof value, "project&1&x&%llx",
                  static_cast<unsigned long long>(reinterpret_cast<uintptr_t>(window)));
    ASSERT_EQ(_putenv_s("TDPROJECTXXXXX", value), 0);

    EXPECT_EQ(TdProject_AddFile("C:\\data\\a.grd"), 77);
    EXPECT_EQ(g_received.tag, 1u);
    EXPECT_EQ(g_received.text, "C:\\data\\a.grd");

    g_received = {};
    const std::string path = dir_.file("announced.grd");
    writeFile(path);
    EXPECT_GE(g_received.messages, 1);
    char full[MAX_PATH];
    ASSERT_NE(GetFullPathNameA(path.c_str(), MAX_PATH, full, nullptr), 0u);
    EXPECT_EQ(g_received.text, full);

    // A zero handle names no host.
    ASSERT_EQ(_putenv_s("TDPROJECTXXXXX", "project&1&x&0"), 0);
    EXPECT_EQ(TdProject_AddFile("C:\\data\\a.grd"), -1);
    ASSERT_EQ(_putenv_s("TDPROJECTXXXXX", ""), 0);
    DestroyWindow(window);
    UnregisterClassA("tovaTestHostProject", windowClass.hInstance);
}

TEST_F(Windows, FoldersAreMadeWithEitherSeparator) {
    const std::string path = dir_.file("a/b\\c/file.grd");
    EXPECT_EQ(TdCreateFolder(path.c_str()), 1);
    EXPECT_TRUE(exists(dir_.file("a\\b\\c")));
    writeFile(dir_.file("d/e/f.grd"));  // grdFileCreate makes the folders itself
    EXPECT_TRUE(exists(dir_.file("d\\e\\f.grd")));
}

TEST_F(Windows, APlugInDllIsChosenByTheDataType) {
    const std::string path = dir_.file("current.grd");
    writeFile(path, -7, true);
    HeaderHandle header = nullptr;
    FileHandle file = nullptr;
    ASSERT_EQ(grdFileRead(path.c_str(), &header, &file), 0);
    ASSERT_EQ(grdEnablePlugin(header, file), 0) << "grdExt_7.dll beside the program";
    ASSERT_EQ(grdGetNoOfItems(header), 4);  // u, v, speed, direction
    double time = -1.0;
    std::vector<float> values(kElements);
    for (int32_t k = 1; k <= 3; ++k) ASSERT_EQ(grdReadItemTimeStep(header, file, &time, values.data()), 0);
    for (int i = 0; i < kElements; ++i) EXPECT_NEAR(values[i], 5.0f * i, 1e-5f) << i;  // hypot(3i, 4i)
    EXPECT_EQ(grdUnloadPlugin(header), 0);
    ASSERT_EQ(grdFileClose(header, &file), 0);
    grdHeaderDestroy(&header);

    // Data type 5 names no plug-in.
    writeFile(path, 5);
    ASSERT_EQ(grdFileRead(path.c_str(), &header, &file), 0);
    EXPECT_EQ(grdEnablePlugin(header, file), -3);
    ASSERT_EQ(grdFileClose(header, &file), 0);
    grdHeaderDestroy(&header);
}

uint32_t grdApp(uint32_t* version) {
    *version = 206;
    uint32_t tag;
    std::memcpy(&tag, "GRD_", 4);
    return tag;
}

TEST_F(Windows, RecordsBeyondFourGibibytesAreReachedByPosition) {
    ULARGE_INTEGER freeBytes{};
    const std::string folder = dir_.path().string();
    if (!GetDiskFreeSpaceExA(folder.c_str(), &freeBytes, nullptr, nullptr) || freeBytes.QuadPart < (6ull << 30))
        GTEST_SKIP() << "skipped: fewer than 6 GiB free for a file over 4 GiB (it is sparse where the file system "
                        "allows, but need not be)";
    const std::string path = dir_.file("large.grd");
    writeFile(path);
    HeaderHandle header = nullptr;
    FileHandle file = nullptr;
    ASSERT_EQ(grdFileEdit(path.c_str(), &header, &file), 0);
    const uint64_t farOffset = (5ull << 30) + 12345;
    const double value = 4.25e9;
    rcfSeek64(file, static_cast<uint32_t>(farOffset), static_cast<uint32_t>(farOffset >> 32), 0);
    ASSERT_EQ(rcfTell64(file), static_cast<int64_t>(farOffset));
    ASSERT_EQ(rcfLrecWrite(file, RCF_DOUBLE, 1, &value), 0);
    const int64_t end = rcfTell64(file);
    EXPECT_GT(end, static_cast<int64_t>(farOffset));
    ASSERT_EQ(rcfFileClose(&file), 0);
    grdHeaderDestroy(&header);

    WIN32_FILE_ATTRIBUTE_DATA attributes{};
    ASSERT_TRUE(GetFileAttributesExA(path.c_str(), GetFileExInfoStandard, &attributes));
    EXPECT_EQ((static_cast<uint64_t>(attributes.nFileSizeHigh) << 32) | attributes.nFileSizeLow,
              static_cast<uint64_t>(end));

    ASSERT_EQ(rcfFileOpenRead(path.c_str(), &file, grdApp, nullptr), 0);
    rcfSeek64(file, static_cast<uint32_t>(farOffset), static_cast<uint32_t>(farOffset >> 32), 0);
    double back = 0.0;
    EXPECT_EQ(rcfLrecRead(file, RCF_DOUBLE, 1, &back), 1u);
    EXPECT_EQ(back, value);
    EXPECT_EQ(rcfTell64(file), end);
    EXPECT_EQ(rcfGetError(file), 0);
    ASSERT_EQ(rcfFileClose(&file), 0);
    DeleteFileA(path.c_str());
}

}  // namespace
