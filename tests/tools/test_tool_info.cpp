// `tova info`: the record-file part and the VRE part as text (golden, with
// the stamps and path masked) and as JSON parsed back and compared with what
// the library reads; gridded, foreign-order and unknown files; files that
// cannot be described.
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <algorithm>

#include "rcf/rcf_internal.h"
#include "tool_test.h"
#include "tova/vre.h"
#include "tova/xfs.h"

using tooltest::masked;
using tooltest::runTova;

namespace {

nlohmann::json infoJson(const std::string& path) {
    const tooltest::Run run = runTova({"info", "--json", path});
    EXPECT_EQ(run.exitCode, 0) << run.err;
    return nlohmann::json::parse(run.out);
}

const char* const kVreGolden = R"(file            FILE
kind            vre
description     VRE file (panel-body responses)
size            2214
byteOrder       little-endian
applicationTag  VRE_
created         YYYY-MM-DD hh:mm:ss
edited          YYYY-MM-DD hh:mm:ss
rcfBase         65
appBase         113
versions:
  layerCreated        104
  layerEdited         104
  applicationCreated  101
  applicationEdited   101
vre:
  formatVersion  101
  parameters:
    index  value  meaning
        0      1  N0
        1      2  body count
        2      3  total panel count
        3      2  N3
        4      1  N4
        5      3
        6      1  1: items 21 and 22 present
        7      2  N7
  symmetry       0, 1
  bodies:
    body  name  panels
       1  hull       2
       2  buoy       1
  scalars:
    item    value  quantity             unit   quantityKey  unitKey
       0  9.80665  GravityAcceleration  m/s^2       110244    20800
       1     42.5  SiteWaterDepth       m           100280    20100
  items:
    item  present  elements  quantity              unit    quantityKey  unitKey
       0  yes            12  BodyCoordinate        m            100514    20100
       1  yes             9  BodyCoordinate        m            100514    20100
       2  yes             3  PanelArea             m^2          110030    20200
       3  yes             9  BodyCoordinate        m            100514    20100
       4  yes             6  PanelModeNormal       -            110243    20000
       5  yes             6  BodyCoordinate        m            100514    20100
       6  yes             6  BodyCoordinate        m            100514    20100
       7  yes             2  BodyMass              kg           110245    21100
       8  yes             4  HydrostaticStiffness  N/m          110246    21600
       9  yes             1  WaveAngularFrequency  rad/s        100085    21900
      10  yes             1  WaveNumber            rad/m        110247    22000
      11  yes            18  BodyMomentOfInertia   kg.m^2       100515    21800
      12  yes             6  PanelPressure         Pa           110248    21400
      13  yes             6  PanelPressure         Pa           110248    21400
      14  yes             4  AddedMass             kg           110266    21100
      15  yes             4  RadiationDamping      N.s/m        110250    21704
      16  yes             2  BodyMainDimension     m            110258    20100
      17  yes             2  BodyMainDimension     m            110258    20100
      18  yes             2  BodyAttitude          deg          110220    20601
      19  yes             2  BodyAttitude          deg          110220    20601
      20  yes             2  BodyMainDimension     m            110258    20100
      21  yes             2  WaveHeading           deg          100415    20601
      22  yes             4  WaveExcitingForce     N/m          100144    21600
)";

}  // namespace

TEST(ToolInfo, VreFileAsText) {
    testutil::TempDir dir;
    const std::string path = dir.file("a.vre");
    tooltest::writeVreFile(path);
    const tooltest::Run run = runTova({"info", path});
    ASSERT_EQ(run.exitCode, 0) << run.err;
    EXPECT_EQ(masked(run.out, path), kVreGolden);
}

TEST(ToolInfo, VreFileAsJsonSaysWhatTheLibraryReads) {
    testutil::TempDir dir;
    const std::string path = dir.file("a.vre");
    // A Latin-1 byte, a quote and a control character in a body name.
    tooltest::writeVreFile(path, "h\xE9ll\"o\n");
    const nlohmann::json doc = infoJson(path);

    VreHandle h = nullptr;
    ASSERT_EQ(vreFileRead(path.c_str(), &h), 0);
    EXPECT_EQ(doc["kind"], "vre");
    EXPECT_EQ(doc["applicationTag"], "VRE_");
    EXPECT_EQ(doc["size"], testutil::readBytes(path).size());
    EXPECT_EQ(doc["versions"]["applicationCreated"], 101);
    const nlohmann::json& vre = doc["vre"];
    for (int32_t i = 0; i < VRE_SIZE_PARAMS; ++i) EXPECT_EQ(vre["parameters"][i]["value"], vreGetVectorParam(h, i));
    EXPECT_EQ(vre["symmetry"], nlohmann::json::array({0, 1}));
    ASSERT_EQ(vre["bodies"].size(), 2u);
    EXPECT_EQ(vre["bodies"][0]["name"], "h\u00E9ll\"o\n");
    EXPECT_EQ(vre["bodies"][1]["name"], "buoy");
    EXPECT_EQ(vre["bodies"][0]["panels"], 2);
    EXPECT_EQ(vre["scalars"][1]["value"].get<double>(), vreGetScalarItem(h, 1));
    EXPECT_EQ(vre["scalars"][0]["value"].get<double>(), vreGetScalarItem(h, 0));
    for (int32_t k = 0; k < VRE_VECTOR_ITEMS; ++k) {
        int32_t key = 0, unit = 0, mode = 0, user = 0;
        vreGetVectorItemUnitInfo(h, k, &key, &unit, &mode, &user);
        const nlohmann::json& item = vre["items"][static_cast<size_t>(k)];
        EXPECT_EQ(item["elements"], vreGetVectorSize(h, k)) << k;
        EXPECT_EQ(item["present"], true);
        EXPECT_EQ(item["quantityKey"], key);
        EXPECT_EQ(item["unitKey"], unit);
    }
    vreHandleFree(h);

    // The text form shows the same name with the odd bytes escaped.
    EXPECT_NE(runTova({"info", path}).out.find("  1  h\\xe9ll\"o\\x0a       2\n"), std::string::npos);
}

TEST(ToolInfo, CrossSectionFileAsTextAndJson) {
    testutil::TempDir dir;
    const std::string path = dir.file("a.xfs");
    tooltest::writeXsecFile(path);
    const tooltest::Run run = runTova({"info", path});
    ASSERT_EQ(run.exitCode, 0) << run.err;
    const std::string text = masked(run.out, path);
    EXPECT_NE(text.find("kind            xfs\n"), std::string::npos) << text;
    EXPECT_NE(text.find("applicationCreated  106\n"), std::string::npos) << text;
    EXPECT_NE(text.find(R"(xfs:
  formatVersion  106
  count          3
  sections:
    primary  secondary    key  extra        raw  selection  processed  coordinates
    Canal                   0                 0          0          0            0
    River A  left       100.5  survey 2019    3          2          0            0
    River A  left         250                 0          0          2            2
)"),
              std::string::npos)
        << text;

    const nlohmann::json doc = infoJson(path);
    XsecTableHandle table = nullptr;
    ASSERT_EQ(xfsXsecTableLoad(path.c_str(), &table, 0), 0);
    EXPECT_EQ(doc["xfs"]["formatVersion"], xfsXsecTableVersion(table));
    ASSERT_EQ(doc["xfs"]["count"], 3);
    XsecCursor cursor = nullptr;
    XsecHandle x = xfsXsecFind(table, "", 0.0, "", &cursor);
    for (const nlohmann::json& row : doc["xfs"]["sections"]) {
        ASSERT_NE(x, nullptr);
        EXPECT_EQ(row["primary"], x->primaryName);
        EXPECT_EQ(row["secondary"], x->secondaryName);
        EXPECT_EQ(row["extra"], x->extraName);
        // Packed members are read by value: they may be unaligned.
        const double key = x->keyValue;
        const uint32_t counts[4] = {x->noRaw, x->noSel, x->noPrc, x->noCoords};
        EXPECT_EQ(row["key"].get<double>(), key);
        EXPECT_EQ(row["raw"], counts[0]);
        EXPECT_EQ(row["selection"], counts[1]);
        EXPECT_EQ(row["processed"], counts[2]);
        EXPECT_EQ(row["coordinates"], counts[3]);
        x = xfsXsecFindNext(table, cursor);
    }
    EXPECT_EQ(x, nullptr);
    xfsXsecTableFree(&table);
}

TEST(ToolInfo, GriddedUnknownAndForeignOrderFilesShowTheirRecordFileHeader) {
    testutil::TempDir dir;
    const std::string grd = dir.file("a.grd");
    tooltest::writeGridFile(grd);
    const tooltest::Run text = runTova({"info", grd});
    ASSERT_EQ(text.exitCode, 0);
    EXPECT_NE(text.out.find("kind            grd\n"), std::string::npos) << text.out;
    EXPECT_NE(text.out.find("grd:\n  fileType "), std::string::npos) << text.out;
    nlohmann::json doc = infoJson(grd);
    EXPECT_EQ(doc["applicationTag"], "GRD_");
    EXPECT_EQ(doc["rcfBase"], 82);
    EXPECT_EQ(doc["appBase"], 130);
    EXPECT_EQ(doc["versions"]["applicationCreated"], 206);
    EXPECT_EQ(doc["versions"]["layerEdited"], 104);

    // No application callback: tag 0x03030303, versions 0.
    const std::string other = dir.file("a.rcf");
    FileHandle f = nullptr;
    ASSERT_EQ(rcfFileOpenCreate(other.c_str(), "", &f, nullptr, 0), 0);
    rcfFileClose(&f);
    doc = infoJson(other);
    EXPECT_EQ(doc["kind"], "unknown");
    EXPECT_EQ(doc["applicationTag"], "0x03030303");
    EXPECT_EQ(doc["versions"]["applicationCreated"], 0);
    EXPECT_EQ(doc.count("grd") + doc.count("vre") + doc.count("xfs"), 0u);

    // The same file as a machine of the other byte order writes it.
    std::vector<uint8_t> bytes = testutil::readBytes(other);
    std::reverse(bytes.begin(), bytes.begin() + 4);
    // Each stamp group (rcfBase 65): six 16-bit values, then two 32-bit versions.
    for (size_t rel = 0; rel < 40;) {
        const size_t n = rel % 20 < 12 ? 2 : 4;
        const auto at = bytes.begin() + static_cast<std::ptrdiff_t>(65 + rel);
        std::reverse(at, at + static_cast<std::ptrdiff_t>(n));
        rel += n;
    }
    testutil::writeBytes(other, bytes);
    doc = infoJson(other);
    EXPECT_EQ(doc["byteOrder"], "big-endian (swapped on this machine)");
    EXPECT_EQ(doc["versions"]["layerCreated"], 104);
    EXPECT_EQ(doc["created"], doc["edited"]);
    EXPECT_EQ(runTova({"check", other}).exitCode, 0);
}

TEST(ToolInfo, FilesThatCannotBeDescribedFailWithAReason) {
    testutil::TempDir dir;
    const std::string text = dir.file("notes.txt");
    testutil::writeBytes(text, {'h', 'e', 'l', 'l', 'o', '\n'});
    const std::vector<std::pair<std::string, std::string>> cases = {
        {text, "is not a record file"},
        {dir.file("missing.vre"), "cannot open"},
        {dir.path().string(), "folder"},
    };
    for (const auto& [path, phrase] : cases) {
        const tooltest::Run run = runTova({"info", path});
        EXPECT_EQ(run.exitCode, 1) << path;
        EXPECT_TRUE(run.out.empty());
        EXPECT_NE(run.err.find(phrase), std::string::npos) << run.err;
    }
    // A cross-section file cut inside a block: the loader refuses it, the
    // record-file part is shown all the same.
    const std::string xfs = dir.file("a.xfs");
    tooltest::writeXsecFile(xfs);
    std::vector<uint8_t> cut = testutil::readBytes(xfs);
    cut.resize(cut.size() - 10);
    testutil::writeBytes(xfs, cut);
    const tooltest::Run refused = runTova({"info", xfs});
    EXPECT_EQ(refused.exitCode, 1);
    EXPECT_NE(refused.out.find("kind            xfs\n"), std::string::npos) << refused.out;
    EXPECT_NE(refused.out.find("xfs:\n  error  "), std::string::npos) << refused.out;
    EXPECT_NE(refused.err.find("the cross-section loader failed: status 2019"), std::string::npos) << refused.err;

    // A VRE file whose body is damaged still shows its header.
    const std::string vre = dir.file("a.vre");
    tooltest::writeVreFile(vre);
    std::vector<uint8_t> bytes = testutil::readBytes(vre);
    bytes.resize(400);
    testutil::writeBytes(vre, bytes);
    const nlohmann::json doc = infoJson(vre);
    EXPECT_EQ(doc["kind"], "vre");
    EXPECT_FALSE(doc["vre"]["items"][22]["present"].get<bool>());
}
