// The gridded-data commands of the tova tool on files made in the test: the
// demo file and what `info` says of it (golden text), `info --json` compared
// with the library's getters, `dump` values compared with what the library
// reads, `stats` against values computed here, and `check` on sound files, on
// a header that lags behind its data and on damaged copies.
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <cmath>
#include <cstring>
#include <sstream>

#include "tool_test.h"
#include "qty/qty.h"
#include "tova/grd.h"

using tooltest::masked;
using tooltest::runTova;

namespace {

const char* const kDemoGolden = R"(grd:
  fileType            1
  fileTypeName        F_EQTIME_FIXEDSPACE_ALLITEMS
  fileTitle           Tidal wave in a coastal basin
  application         tova demo
  applicationVersion  1
  dataType            0
  statisticsType      2
  compressed          no
  deleteValues:
    float     -1e-35
    double    -1e-255
    byte      0
    int       2147483647
    unsigned  2147483647
  projection:
    type         1
    name         UTM-32N
    longitude    9
    latitude     54
    orientation  0
  timeAxis:
    type         3
    kind         F_CAL_EQ_AXIS
    unit         s
    unitKey      1400
    startDate    2024-03-21
    startTime    00:00:00
    startOffset  0
    step         3600
    timeSteps    48
    firstIndex   0
    end          2024-03-22 23:00:00
  items:
    item  name                quantity    quantityKey  unit  unitKey  dataType  axis  sizes     origin           step      axisUnit  elements  stored  compressed
       1  Water level         WaterLevel        40101  m       20100  float     EqD2  200, 150  420000, 5985000  500, 500  m            30000   30000  no
       2  Current velocity x  VelocityX         40202  m/s     20700  float     EqD2  200, 150  420000, 5985000  500, 500  m            30000   30000  no
       3  Current velocity y  VelocityY         40203  m/s     20700  float     EqD2  200, 150  420000, 5985000  500, 500  m            30000   30000  no
  staticItems:
    static  name        quantity  quantityKey  unit  unitKey  dataType  axis  sizes     origin           step      axisUnit  elements
         1  Bathymetry  BedLevel        40103  m       20100  float     EqD2  200, 150  420000, 5985000  500, 500  m            30000
  customBlocks:
    name                                     type    count  values
    gravity, tide period (h), amplitude (m)  double      3  9.81, 12.42, 1.2
)";

// A file open through the library for the test's own reading.
class Opened {
public:
    explicit Opened(const std::string& path) { EXPECT_EQ(grdFileRead(path.c_str(), &header_, &file_), 0); }
    ~Opened() {
        if (file_ != nullptr) grdFileClose(header_, &file_);
        if (header_ != nullptr) grdHeaderDestroy(&header_);
    }
    Opened(const Opened&) = delete;
    Opened& operator=(const Opened&) = delete;
    HeaderHandle h() const { return header_; }
    FileHandle f() const { return file_; }

private:
    HeaderHandle header_ = nullptr;
    FileHandle file_ = nullptr;
};

std::vector<std::vector<std::string>> csvRows(const std::string& text) {
    std::vector<std::vector<std::string>> rows;
    std::istringstream in(text);
    for (std::string line; std::getline(in, line);) {
        std::vector<std::string> cells;
        std::string cell;
        std::istringstream fields(line);
        while (std::getline(fields, cell, ',')) cells.push_back(cell);
        if (!line.empty() && line.back() == ',') cells.emplace_back();
        rows.push_back(cells);
    }
    return rows;
}

// Index in layout.headers of the first start of block tag.
size_t blockIndex(const std::vector<uint8_t>& bytes, const tooltest::Layout& layout, uint16_t tag) {
    for (size_t k = 0; k < layout.headers.size(); ++k) {
        const auto at = static_cast<size_t>(layout.headers[k].first);
        if (bytes[at] == 0xFE && bytes[at + 1] == (tag & 0xFF) && bytes[at + 2] == (tag >> 8)) return k;
    }
    ADD_FAILURE() << "no block " << tag;
    return 0;
}

// "<path>: damaged at offset N: ..." -> N, or -1.
int64_t damagedOffset(const tooltest::Run& run) {
    const size_t at = run.out.find("damaged at offset ");
    return at == std::string::npos ? -1 : std::stoll(run.out.substr(at + 18));
}

}  // namespace

TEST(ToolGrid, DemoWritesASampleThatInfoDescribes) {
    testutil::TempDir dir;
    const std::string path = dir.file("out/sample.grd");
    const tooltest::Run demo = runTova({"demo", path});
    ASSERT_EQ(demo.exitCode, 0) << demo.err;
    EXPECT_EQ(demo.out.rfind("Wrote " + path + " (", 0), 0u) << demo.out;
    EXPECT_NE(demo.out.find("tova dump " + path + " --item 1 --step 24"), std::string::npos) << demo.out;

    const tooltest::Run info = runTova({"info", path});
    ASSERT_EQ(info.exitCode, 0) << info.err;
    const std::string text = masked(info.out, path);
    EXPECT_NE(text.find("kind            grd\n"), std::string::npos) << text;
    EXPECT_NE(text.find("applicationCreated  206\n"), std::string::npos) << text;
    // The gridded part holds no stamps: it is compared unmasked.
    ASSERT_NE(info.out.find("grd:\n"), std::string::npos) << text;
    EXPECT_EQ(info.out.substr(info.out.find("grd:\n")), kDemoGolden);

    // Land is delete values, the sea a tide of at most 1.2 m; the stored
    // statistics agree with what is read.
    const nlohmann::json stats = nlohmann::json::parse(runTova({"stats", path, "--json"}).out);
    ASSERT_EQ(stats["computed"].size(), 3u);
    EXPECT_EQ(stats["timeSteps"], 48);
    for (const auto& row : stats["computed"]) {
        EXPECT_GT(row["deletes"].get<int64_t>(), 0);
        EXPECT_EQ(row["values"].get<int64_t>() + row["deletes"].get<int64_t>(), 48 * 30000);
    }
    EXPECT_LE(stats["computed"][0]["maximum"].get<double>(), 1.2 + 1e-6);
    for (const auto& row : stats["stored"]) EXPECT_TRUE(row["agrees"].get<bool>()) << row;

    const tooltest::Run check = runTova({"check", path});
    EXPECT_EQ(check.exitCode, 0) << check.out;
    EXPECT_EQ(check.out.find("warning"), std::string::npos) << check.out;
}

TEST(ToolGrid, InfoJsonSaysWhatTheLibraryReads) {
    testutil::TempDir dir;
    const std::string path = dir.file("a.grd");
    tooltest::writeGridFile(path);
    const tooltest::Run run = runTova({"info", path, "--json"});
    ASSERT_EQ(run.exitCode, 0) << run.err;
    const nlohmann::json doc = nlohmann::json::parse(run.out);
    const nlohmann::json& grd = doc["grd"];

    Opened file(path);
    const HeaderHandle h = file.h();
    EXPECT_EQ(grd["fileType"], grdGetFileType(h));
    EXPECT_EQ(grd["fileTypeName"], "F_EQTIME_FIXEDSPACE_ALLITEMS");
    EXPECT_EQ(grd["fileTitle"], grdGetFileTitle(h));
    EXPECT_EQ(grd["application"], grdGetAppTitle(h));
    EXPECT_EQ(grd["applicationVersion"], 3);
    EXPECT_EQ(grd["statisticsType"], 2);
    EXPECT_EQ(grd["deleteValues"]["float"].get<float>(), grdGetDeleteValFloat(h));
    EXPECT_EQ(grd["deleteValues"]["double"].get<double>(), grdGetDeleteValDouble(h));
    EXPECT_EQ(grd["projection"]["name"], "UTM-32");
    EXPECT_EQ(grd["projection"]["latitude"].get<double>(), 54.0);

    const nlohmann::json& axis = grd["timeAxis"];
    EXPECT_EQ(axis["kind"], "F_CAL_EQ_AXIS");
    EXPECT_EQ(axis["startDate"], "2024-03-21");
    EXPECT_EQ(axis["startTime"], "06:00:00");
    EXPECT_EQ(axis["step"].get<double>(), 1800.0);
    EXPECT_EQ(axis["timeSteps"], 3);
    EXPECT_EQ(axis["end"], "2024-03-21 07:00:00");

    ASSERT_EQ(grd["items"].size(), 2u);
    for (int32_t n = 1; n <= 2; ++n) {
        const nlohmann::json& item = grd["items"][static_cast<size_t>(n - 1)];
        int32_t quantity = 0, unit = 0, type = 0;
        const char *quantityText = nullptr, *name = nullptr, *unitText = nullptr;
        ASSERT_EQ(grdGetItemInfo(grdItemD(h, n), &quantity, &quantityText, &name, &unit, &unitText, &type), 0);
        EXPECT_EQ(item["item"], n);
        EXPECT_EQ(item["name"], name);
        EXPECT_EQ(item["quantity"], quantityText);
        EXPECT_EQ(item["quantityKey"], quantity);
        EXPECT_EQ(item["unit"], unitText);
        EXPECT_EQ(item["unitKey"], unit);
        EXPECT_EQ(item["elements"], grdGetItemElements(grdItemD(h, n)));
        EXPECT_EQ(item["compressed"], false);
    }
    const nlohmann::json& level = grd["items"][0];
    EXPECT_EQ(level["axis"], "EqD2");
    EXPECT_EQ(level["sizes"], nlohmann::json::array({4, 3}));
    EXPECT_EQ(level["origin"][1].get<float>(), 200.0f);
    EXPECT_EQ(level["step"][0].get<float>(), 50.0f);
    EXPECT_EQ(grd["items"][1]["axis"], "NeqD1");
    EXPECT_EQ(grd["items"][1]["dataType"], "double");

    ASSERT_EQ(grd["staticItems"].size(), 2u);
    EXPECT_EQ(grd["staticItems"][0]["name"], "depth");
    EXPECT_EQ(grd["staticItems"][0]["quantity"], "BedLevel");
    EXPECT_EQ(grd["staticItems"][1]["name"], "flags");
    EXPECT_EQ(grd["staticItems"][1]["elements"], 5);
    ASSERT_EQ(grd["customBlocks"].size(), 1u);
    EXPECT_EQ(grd["customBlocks"][0]["name"], "run");
    EXPECT_EQ(grd["customBlocks"][0]["values"], nlohmann::json::array({7, 8, 9}));
}

TEST(ToolGrid, DumpGivesTheValuesTheLibraryReads) {
    testutil::TempDir dir;
    const std::string path = dir.file("a.grd");
    tooltest::writeGridFile(path, 5);

    // Every value of every step as CSV, compared with the library's reading.
    const tooltest::Run csv = runTova({"dump", path, "--format", "csv"});
    ASSERT_EQ(csv.exitCode, 0) << csv.err;
    const auto rows = csvRows(csv.out);
    ASSERT_EQ(rows.size(), 1u + 5 * (12 + 5));
    EXPECT_EQ(rows[0], (std::vector<std::string>{"step", "time", "item", "element", "i", "j", "k", "value"}));
    Opened file(path);
    size_t r = 1;
    for (int32_t t = 0; t < 5; ++t) {
        for (int32_t n = 1; n <= 2; ++n) {
            double time = 0;
            float level[12];
            double flux[5];
            ASSERT_EQ(grdReadItemTimeStep(file.h(), file.f(), &time, n == 1 ? static_cast<void*>(level) : flux), 0);
            for (int32_t e = 0; e < (n == 1 ? 12 : 5); ++e, ++r) {
                const auto& row = rows[r];
                ASSERT_EQ(row.size(), 8u) << r;
                EXPECT_EQ(row[0], std::to_string(t));
                EXPECT_EQ(row[1], "2024-03-21 0" + std::to_string(6 + t / 2) + (t % 2 != 0 ? ":30:00" : ":00:00"));
                EXPECT_EQ(row[2], std::to_string(n));
                EXPECT_EQ(row[3], std::to_string(e));
                if (n == 1) {
                    EXPECT_EQ(row[4], std::to_string(e % 4));
                    EXPECT_EQ(row[5], std::to_string(e / 4));
                    if (level[e] == grdGetDeleteValFloat(file.h())) {
                        EXPECT_EQ(row[7], "") << r;
                    } else {
                        EXPECT_EQ(std::strtof(row[7].c_str(), nullptr), level[e]) << r;
                    }
                } else {
                    EXPECT_EQ(row[5], "");
                    EXPECT_EQ(std::strtod(row[7].c_str(), nullptr), flux[e]) << r;
                }
            }
        }
    }

    // One item of a few steps as text: a title line per step, delete values
    // named, a limit on the values shown.
    const tooltest::Run text = runTova({"dump", path, "--item", "1", "--steps", "3:", "--limit", "2"});
    ASSERT_EQ(text.exitCode, 0) << text.err;
    EXPECT_EQ(text.out,
              "time step 3  2024-03-21 07:30:00  item 1 \"level\" (WaterLevel, m) float, EqD2 4 x 3, 12 values\n"
              "         i       j  value\n"
              "         0       0  delete\n"
              "         1       0  2.25\n"
              "  ... 10 more values\n\n"
              "time step 4  2024-03-21 08:00:00  item 1 \"level\" (WaterLevel, m) float, EqD2 4 x 3, 12 values\n"
              "         i       j  value\n"
              "         0       0  delete\n"
              "         1       0  3.25\n"
              "  ... 10 more values\n");
    const auto second = csvRows(runTova({"dump", path, "--item", "2", "--step", "4", "--format", "csv"}).out);
    ASSERT_EQ(second.size(), 6u);
    EXPECT_EQ(second[5][7], "38");

    // Static items: the bathymetry-like grid and the integers.
    const auto depth = csvRows(runTova({"dump", path, "--static", "1", "--format", "csv"}).out);
    ASSERT_EQ(depth.size(), 13u);
    EXPECT_EQ(depth[0], (std::vector<std::string>{"static", "element", "i", "j", "k", "value"}));
    for (size_t e = 0; e < 12; ++e) EXPECT_EQ(std::strtof(depth[e + 1][5].c_str(), nullptr), 1.5f + static_cast<float>(e));
    const tooltest::Run flags = runTova({"dump", path, "--static", "2"});
    EXPECT_NE(flags.out.find("static 2 \"flags\" (Undefined, undefined) integer*4, EqD1 5, 5 values\n"), std::string::npos)
        << flags.out;
    EXPECT_NE(flags.out.find("         4  14\n"), std::string::npos) << flags.out;
}

TEST(ToolGrid, StatsComputeMinMaxMeanAndDeletesAndMatchTheStoredOnes) {
    testutil::TempDir dir;
    const std::string path = dir.file("a.grd");
    tooltest::writeGridFile(path, 4);
    const tooltest::Run run = runTova({"stats", path, "--json"});
    ASSERT_EQ(run.exitCode, 0) << run.err;
    const nlohmann::json doc = nlohmann::json::parse(run.out);
    ASSERT_EQ(doc["computed"].size(), 2u);
    for (int32_t n = 1; n <= 2; ++n) {
        double minimum = INFINITY, maximum = -INFINITY, sum = 0;
        int64_t values = 0, deletes = 0;
        for (int32_t t = 0; t < 4; ++t) {
            for (int32_t e = 0; e < (n == 1 ? 12 : 5); ++e) {
                const double v = n == 1 ? static_cast<double>(static_cast<float>(tooltest::gridValue(t, n, e)))
                                        : tooltest::gridValue(t, n, e);
                if (n == 1 && static_cast<float>(v) == F_DELETE_VALUE_FLOAT) {
                    ++deletes;
                    continue;
                }
                minimum = std::min(minimum, v);
                maximum = std::max(maximum, v);
                sum += v;
                ++values;
            }
        }
        const nlohmann::json& row = doc["computed"][static_cast<size_t>(n - 1)];
        EXPECT_EQ(row["values"], values);
        EXPECT_EQ(row["deletes"], deletes);
        EXPECT_EQ(row["minimum"].get<double>(), minimum);
        EXPECT_EQ(row["maximum"].get<double>(), maximum);
        EXPECT_NEAR(row["mean"].get<double>(), sum / static_cast<double>(values), 1e-12);
        const nlohmann::json& stored = doc["stored"][static_cast<size_t>(n - 1)];
        EXPECT_TRUE(stored["agrees"].get<bool>()) << stored;
        EXPECT_EQ(stored["deletes"], deletes);
        EXPECT_NEAR(stored["mean"].get<double>(), sum / static_cast<double>(values), 1e-12);
    }
    const nlohmann::json one = nlohmann::json::parse(runTova({"stats", path, "--item", "2", "--json"}).out);
    ASSERT_EQ(one["computed"].size(), 1u);
    EXPECT_EQ(one["computed"][0]["item"], 2);
    EXPECT_EQ(one["computed"][0]["maximum"].get<double>(), 30.0);
    EXPECT_NE(runTova({"stats", path}).out.find("stored:\n  item"), std::string::npos);
}

TEST(ToolGrid, CheckFollowsTheSectionsAndReportsWhereTheyBreak) {
    testutil::TempDir dir;
    const std::string path = dir.file("a.grd");
    tooltest::writeGridFile(path);
    const std::vector<uint8_t> good = testutil::readBytes(path);
    const tooltest::Layout layout = tooltest::walkLayout(path);
    // Each time step: a 50001 block (3 bytes), its terminator, a float record
    // of 12 and a double record of 5.
    const int64_t stepBytes = 3 + 1 + (5 + 48) + (5 + 40);
    const auto size = static_cast<int64_t>(good.size());
    tooltest::Run run = runTova({"check", path});
    ASSERT_EQ(run.exitCode, 0) << run.out;

    // The file cut after two of its three steps, and within the last step.
    testutil::writeBytes(path, std::vector<uint8_t>(good.begin(), good.end() - stepBytes));
    run = runTova({"check", path});
    EXPECT_EQ(run.exitCode, 1);
    EXPECT_NE(run.out.find("the header says 3 time steps, the data ends after 2"), std::string::npos) << run.out;
    testutil::writeBytes(path, std::vector<uint8_t>(good.begin(), good.end() - 45));
    run = runTova({"check", path});
    EXPECT_EQ(damagedOffset(run), size - 45) << run.out;
    EXPECT_NE(run.out.find("time step 2 ends after 1 of its 2 item records"), std::string::npos) << run.out;

    // A record of the wrong type in a time step, at its own offset.
    const int64_t lastFloat = size - 45 - 53;
    std::vector<uint8_t> bytes = good;
    bytes[static_cast<size_t>(lastFloat)] = 4;  // integer*4 instead of float
    testutil::writeBytes(path, bytes);
    run = runTova({"check", path});
    EXPECT_EQ(damagedOffset(run), lastFloat) << run.out;
    EXPECT_NE(run.out.find("time step 2, item 1: expected a float record of 12 elements, found an integer*4"),
              std::string::npos)
        << run.out;

    // Header blocks out of order: the file type where the title belongs.
    bytes = good;
    const auto titleBlock = static_cast<size_t>(layout.headers[blockIndex(good, layout, 10001)].first);
    bytes[titleBlock + 1] = 10004 & 0xFF;
    testutil::writeBytes(path, bytes);
    run = runTova({"check", path});
    EXPECT_EQ(damagedOffset(run), static_cast<int64_t>(titleBlock)) << run.out;
    EXPECT_NE(run.out.find("header field block 10004 occurs twice"), std::string::npos) << run.out;

    // A header that counts fewer time steps than the data holds (a writer
    // that stopped before its last header update): a warning, no damage.
    // The time block 20053: date, time, unit, start and step, then the
    // number of time steps and the first index.
    bytes = good;
    const size_t counters = blockIndex(good, layout, 20053) + 5;
    bytes[static_cast<size_t>(layout.headers[counters].second)] = 2;
    testutil::writeBytes(path, bytes);
    run = runTova({"check", path});
    EXPECT_EQ(run.exitCode, 0) << run.out;
    EXPECT_NE(run.out.find("warning: the header says 2 time steps, the data holds 3 complete ones"), std::string::npos)
        << run.out;
    EXPECT_NE(runTova({"info", path}).out.find("timeSteps    2\n"), std::string::npos);
}

TEST(ToolGrid, DamagedFilesNeverCrashInfoDumpOrStats) {
    testutil::TempDir dir;
    const std::string good = dir.file("a.grd");
    tooltest::writeGridFile(good);
    const std::vector<uint8_t> bytes = testutil::readBytes(good);
    const tooltest::Layout layout = tooltest::walkLayout(good);
    const std::string copy = dir.file("b.grd");

    // Flipped bits across the header stream and in every record header,
    // and cuts at a stride: the library refuses or reads them, the tool
    // reports, never crashes.
    std::vector<std::vector<uint8_t>> variants;
    uint32_t bit = 0;
    const auto flip = [&](uint64_t offset) {
        std::vector<uint8_t> v = bytes;
        v[offset] ^= static_cast<uint8_t>(1u << (bit++ % 8));
        variants.push_back(std::move(v));
    };
    for (uint64_t n = layout.appBase; n < bytes.size(); n += 41) flip(n);
    for (const auto& [begin, end] : layout.headers) flip(static_cast<uint64_t>(begin + (end - begin) / 2));
    for (uint64_t n = layout.appBase; n < bytes.size(); n += 151) variants.emplace_back(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(n));

    for (size_t i = 0; i < variants.size(); ++i) {
        testutil::writeBytes(copy, variants[i]);
        for (const std::vector<std::string>& args :
             {std::vector<std::string>{"info", copy}, {"dump", copy, "--limit", "2"}, {"stats", copy},
              {"dump", copy, "--static", "1", "--format", "csv"}}) {
            const tooltest::Run run = runTova(args);
            ASSERT_TRUE(run.clean()) << "variant " << i << ", " << args[0] << ": " << run.exitCode << " "
                                     << run.signal << "\n"
                                     << run.err;
        }
    }
}

TEST(ToolGrid, CompressedAndNonEquidistantFiles) {
    testutil::TempDir dir;
    const auto ok = [](int32_t status) { ASSERT_EQ(status, 0); };
    // A compressed 4 x 3 grid whose key holds five cells, two time steps.
    const std::string packed = dir.file("packed.grd");
    HeaderHandle h = nullptr;
    FileHandle f = nullptr;
    ok(grdHeaderCreate(F_EQTIME_FIXEDSPACE_ALLITEMS, "packed", "tests", 1, 1, F_ITEM_STATS_ELEMENT, &h));
    ok(grdSetEqTimeAxis(h, QTY_UNIT_SECOND, 100.0, 60.0, 0));
    const int32_t kx[5] = {0, 1, 3, 2, 0}, ky[5] = {0, 0, 1, 2, 2};
    ok(grdSetEncodeKey(h, kx, ky, nullptr, 5));
    ok(grdSetItemInfo(h, grdItemD(h, 1), 40101, "level", 20100, RCF_FLOAT));
    ok(grdSetItemAxisEqD2(grdItemD(h, 1), 20100, 4, 3, 0.0f, 0.0f, 1.0f, 1.0f));
    ok(grdFileCreate(packed.c_str(), h, &f));
    for (int32_t t = 0; t < 2; ++t) {
        float v[12];
        for (int32_t e = 0; e < 12; ++e) v[e] = 100.0f * static_cast<float>(t) + static_cast<float>(e);
        ok(grdWriteItemTimeStep(h, f, 0.0, v));
    }
    ok(grdFileClose(h, &f));
    grdHeaderDestroy(&h);

    EXPECT_EQ(runTova({"check", packed}).exitCode, 0);
    const nlohmann::json info = nlohmann::json::parse(runTova({"info", packed, "--json"}).out);
    EXPECT_EQ(info["grd"]["compressed"], true);
    EXPECT_EQ(info["grd"]["keyLength"], 5);
    EXPECT_EQ(info["grd"]["items"][0]["stored"], 5);
    EXPECT_EQ(info["grd"]["staticItems"].size(), 0u);  // the keys are no ordinary static items
    // Cells outside the key are delete values; the others hold what was written.
    const auto rows = csvRows(runTova({"dump", packed, "--step", "1", "--format", "csv"}).out);
    ASSERT_EQ(rows.size(), 13u);
    for (int32_t e = 0; e < 12; ++e) {
        bool inKey = false;
        for (int32_t i = 0; i < 5; ++i) inKey = inKey || ky[i] * 4 + kx[i] == e;
        EXPECT_EQ(rows[static_cast<size_t>(e) + 1][1], "160");
        EXPECT_EQ(rows[static_cast<size_t>(e) + 1][7], inKey ? std::to_string(100 + e) : "") << e;
    }
    const nlohmann::json stats = nlohmann::json::parse(runTova({"stats", packed, "--json"}).out);
    EXPECT_EQ(stats["computed"][0]["values"], 10);
    EXPECT_EQ(stats["computed"][0]["deletes"], 0);
    EXPECT_EQ(stats["computed"][0]["mean"].get<double>(), 55.2);
    EXPECT_TRUE(stats["stored"][0]["agrees"].get<bool>());

    // File type 4: each time step stores its time; a calendar across a leap day.
    const std::string neq = dir.file("neq.grd");
    ok(grdHeaderCreate(F_NEQTIME_FIXEDSPACE_ALLITEMS, "neq", "tests", 1, 1, F_ITEM_STATS_GLOBAL, &h));
    ok(grdSetNeqCalendarAxis(h, "2020-02-28", "23:00:00", QTY_UNIT_SECOND, 0.0, 0));
    ok(grdSetItemInfo(h, grdItemD(h, 1), QTY_ITEM_UNDEFINED, "x", 0, RCF_DOUBLE));
    ok(grdSetItemAxisEqD0(grdItemD(h, 1), 0));
    ok(grdFileCreate(neq.c_str(), h, &f));
    const double times[3] = {500.0, 4100.0, 90500.5};
    for (int32_t t = 0; t < 3; ++t) {
        const double v = 1.5 * t;
        ok(grdWriteItemTimeStep(h, f, times[t], &v));
    }
    ok(grdFileClose(h, &f));
    grdHeaderDestroy(&h);

    EXPECT_EQ(runTova({"check", neq}).exitCode, 0);
    const nlohmann::json axis = nlohmann::json::parse(runTova({"info", neq, "--json"}).out)["grd"]["timeAxis"];
    EXPECT_EQ(axis["startTime"], "23:08:20");  // the first time is the start offset
    EXPECT_EQ(axis["end"], "2020-03-01 00:08:20.500");
    EXPECT_EQ(runTova({"dump", neq, "--format", "csv"}).out,
              "step,time,item,element,i,j,k,value\n"
              "0,2020-02-28 23:08:20,1,0,,,,0\n"
              "1,2020-02-29 00:08:20,1,0,,,,1.5\n"
              "2,2020-03-01 00:08:20.500,1,0,,,,3\n");
}
