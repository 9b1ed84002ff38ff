// `tova convert` through the built tool: a gridded file to netCDF and back
// (when the Python package and xarray are there), and the hint on how to
// install them when the interpreter is missing.
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <cstdlib>

#include "tool_test.h"

using tooltest::runTova;

TEST(ToolConvert, GriddedFileToNetcdfAndBack) {
    testutil::TempDir dir;
    const std::string grd = dir.file("run.grd"), nc = dir.file("run.nc"), back = dir.file("back.grd");
    tooltest::writeGridFile(grd);
    const tooltest::Run toNetcdf = runTova({"convert", grd, nc});
    if (toNetcdf.exitCode == 1 && toNetcdf.err.find("needs the Python package") != std::string::npos) {
        GTEST_SKIP() << "no Python package tova with xarray: " << toNetcdf.err;
    }
    ASSERT_EQ(toNetcdf.exitCode, 0) << toNetcdf.err;
    const std::vector<uint8_t> head = testutil::readBytes(nc);
    ASSERT_GE(head.size(), 4u);
    EXPECT_EQ(std::string(head.begin() + 1, head.begin() + 4), "HDF");  // netCDF-4 by default

    const tooltest::Run toGrid = runTova({"convert", nc, back});
    ASSERT_EQ(toGrid.exitCode, 0) << toGrid.err;
    const auto items = [](const std::string& path) {
        const tooltest::Run info = runTova({"info", path, "--json"});
        nlohmann::json names;
        for (const auto& item : nlohmann::json::parse(info.out)["grd"]["items"]) names.push_back(item["name"]);
        return names;
    };
    EXPECT_EQ(items(back), items(grd));
    EXPECT_EQ(runTova({"check", back}).exitCode, 0);
}

TEST(ToolConvert, SaysHowToInstallWhenPythonIsMissing) {
    testutil::TempDir dir;
    setenv("TOVA_PYTHON", dir.file("no-such-python").c_str(), 1);
    const tooltest::Run run = runTova({"convert", "a.nc", "b.grd"});
    unsetenv("TOVA_PYTHON");
    EXPECT_EQ(run.exitCode, 1);
    EXPECT_NE(run.err.find("apt-get install python3-xarray"), std::string::npos) << run.err;
}
