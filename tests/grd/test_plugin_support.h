// Test support for the plug-in tests: library names of this platform, a
// probe that holds a test plug-in loaded and reads the log it records, and a
// fixture that writes small data files and opens them for reading.
#pragma once

#include <gtest/gtest.h>

#include <dlfcn.h>

#include <cstdint>
#include <string>
#include <vector>

#include "test_lifecycle_support.h"
#include "tova/grdext.h"

namespace grdtest {

// The file name that the library loads for data type n.
inline std::string pluginFile(int32_t n) {
#ifdef __APPLE__
    return "grdExt_" + std::to_string(n) + ".dylib";
#else
    return "grdExt_" + std::to_string(n) + ".so";
#endif
}

// Whether the plug-in library of data type n is loaded in this process.
inline bool pluginLoaded(int32_t n) {
    void* handle = dlopen(pluginFile(n).c_str(), RTLD_NOW | RTLD_NOLOAD);
    if (handle != nullptr) dlclose(handle);
    return handle != nullptr;
}

// Holds a test plug-in (tests/grd/plugins) loaded for the life of the probe,
// so that its call log outlives an unload by the library, and reads the log.
class PluginProbe {
public:
    explicit PluginProbe(int32_t n) : handle_(dlopen(pluginFile(n).c_str(), RTLD_NOW | RTLD_LOCAL)) {
        EXPECT_NE(handle_, nullptr) << dlerror();
        clear();
    }
    ~PluginProbe() {
        if (handle_ != nullptr) dlclose(handle_);
    }
    PluginProbe(const PluginProbe&) = delete;
    PluginProbe& operator=(const PluginProbe&) = delete;

    std::string log() const {
        const auto fn = function<const char* (*)()>("testPluginLog");
        return fn != nullptr ? fn() : "";
    }
    void clear() const {
        if (const auto fn = function<void (*)()>("testPluginClearLog")) fn();
    }

private:
    template <class Fn>
    Fn function(const char* name) const {
        return handle_ != nullptr ? reinterpret_cast<Fn>(dlsym(handle_, name)) : nullptr;
    }
    void* handle_;
};

class PluginTest : public FileTest {
protected:
    // Opens path for reading into the fixture's header and file (closing
    // the file that was open).
    void open(const std::string& path) {
        if (file_ != nullptr) rcfFileClose(&file_);
        openRead(path);
    }

    // Reads the item under the cursor into a buffer of its element count;
    // returns the status, the time through *time.
    template <class T>
    int32_t read(std::vector<T>& values, double* time = nullptr) {
        int32_t next = 0;
        EXPECT_EQ(grdGetItemCursor(header_, &next, nullptr), 0);
        values.assign(static_cast<size_t>(grdGetItemElements(grdItemD(header_, next))), T{});
        double t = -1.0;
        const int32_t status = grdReadItemTimeStep(header_, file_, &t, values.data());
        if (time != nullptr) *time = t;
        return status;
    }

    // The cursor as (next item, time steps done).
    std::pair<int32_t, int32_t> cursor() const {
        int32_t next = 0, done = 0;
        EXPECT_EQ(grdGetItemCursor(header_, &next, &done), 0);
        return {next, done};
    }
};

}  // namespace grdtest
