// `tova convert` through the built tool: a gridded file to netCDF and back
// (when the Python package and xarray are there), and the hint on how to
// install them when the interpreter is missing.
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <cstdlib>

#include "tool_test.h"

using tooltest::runTova;

TEST(ToolConvert, DemoFileToNetcdfThatCfReadersDecodeAndBack) {
    testutil::TempDir dir;
    const std::string grd = dir.file("demo.grd"), nc = dir.file("demo.nc"), back = dir.file("back.grd");
    ASSERT_EQ(runTova({"demo", grd}).exitCode, 0);
    const tooltest::Run toNetcdf = runTova({"convert", grd, nc});
    if (toNetcdf.exitCode == 1 && toNetcdf.err.find("needs the Python package") != std::string::npos) {
        GTEST_SKIP() << "no Python package tova with xarray: " << toNetcdf.err;
    }
    ASSERT_EQ(toNetcdf.exitCode, 0) << toNetcdf.err;
    const std::vector<uint8_t> head = testutil::readBytes(nc);
    ASSERT_GE(head.size(), 4u);
    EXPECT_EQ(std::string(head.begin() + 1, head.begin() + 4), "HDF");  // netCDF-4 by default

    // The grid and the time axis as a CF reader finds them.
    if (std::system("ncdump -h /dev/null > /dev/null 2>&1") != 127 * 256) {
        const std::string header = dir.file("header.txt");
        ASSERT_EQ(std::system(("ncdump -h '" + nc + "' > '" + header + "'").c_str()), 0);
        const std::vector<uint8_t> bytes = testutil::readBytes(header);
        const std::string text(bytes.begin(), bytes.end());
        const char* const expected[] = {"time:units = \"seconds since 2024-03-21\"",
                                        "time:calendar = \"proleptic_gregorian\"",
                                        "x:standard_name = \"projection_x_coordinate\"",
                                        "Water_level:grid_mapping = \"crs\"",
                                        "crs:grid_mapping_name = \"transverse_mercator\"",
                                        ":Conventions = \"CF-1.10\""};
        for (const char* line : expected) {
            EXPECT_NE(text.find(line), std::string::npos) << line;
        }
    }

    const tooltest::Run toGrid = runTova({"convert", nc, back});
    ASSERT_EQ(toGrid.exitCode, 0) << toGrid.err;
    const auto items = [](const std::string& path) {
        const tooltest::Run info = runTova({"info", path, "--json"});
        const nlohmann::json parsed = nlohmann::json::parse(info.out);
        nlohmann::json out;
        for (const auto& item : parsed["grd"]["items"]) out.push_back(item["quantity"]);
        return out;
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
