// Writes the seed corpora of the fuzz targets with the library's own writers:
// small valid files of every kind (and, for the record layer, record bodies
// with operation scripts). Stamps are fixed so that the seeds only change
// when the formats do.
//
//   make_corpus OUTDIR      writes OUTDIR/fuzz_<target>/<seed>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

#include "grd/fileio.h"
#include "qty/qty.h"
#include "rcf/rcf_internal.h"
#include "tova/grd.h"
#include "tova/vre.h"
#include "tova/xfs.h"

namespace {

namespace fs = std::filesystem;
using Bytes = std::vector<uint8_t>;

fs::path g_out;
int g_failures = 0;

void check(bool ok, const char* what) {
    if (!ok) {
        std::fprintf(stderr, "make_corpus: %s failed\n", what);
        ++g_failures;
    }
}

Bytes readFile(const fs::path& path) {
    std::ifstream in(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

void writeFile(const fs::path& path, const Bytes& bytes) {
    fs::create_directories(path.parent_path());
    std::ofstream out(path, std::ios::binary | std::ios::trunc);
    out.write(reinterpret_cast<const char*>(bytes.data()), static_cast<std::streamsize>(bytes.size()));
}

// Position of the stamps: just after the 0x1A that ends the header's text.
size_t rcfBaseOf(const Bytes& file) {
    for (size_t i = 0; i < file.size(); ++i) {
        if (file[i] == 0x1A) return i + 1;
    }
    return file.size();
}

// Replaces the creation and edit stamps with a fixed date (host order).
void fixStamps(Bytes& file) {
    const size_t base = rcfBaseOf(file);
    if (base + 32 > file.size()) return;
    const int16_t stamp[6] = {2001, 2, 3, 4, 5, 6};
    std::memcpy(&file[base], stamp, sizeof stamp);
    std::memcpy(&file[base + 20], stamp, sizeof stamp);
}

// A temporary file for the writers, moved into the corpus with fixed stamps.
class Seed {
public:
    Seed(const char* target, const char* name) : dest_(g_out / target / name), temp_(g_out / ".writing") {}
    const char* path() const { return tempText_.c_str(); }
    ~Seed() {
        Bytes bytes = readFile(temp_);
        fixStamps(bytes);
        writeFile(dest_, bytes);
        fs::remove(temp_);
    }
    Seed(const Seed&) = delete;
    Seed& operator=(const Seed&) = delete;

private:
    fs::path dest_;
    fs::path temp_;
    std::string tempText_ = temp_.string();
};

// ---- Record layer: flags byte, script, body -----------------------------------

// Application callbacks: the record-layer seeds' own, and older format
// versions of the cross-section and VRE files.
template <char A, char B, char C, char D, uint32_t Version>
uint32_t appIdent(uint32_t* version) {
    *version = Version;
    const char four[4] = {A, B, C, D};
    uint32_t tag = 0;
    std::memcpy(&tag, four, 4);
    return tag;
}
constexpr auto seedApp = appIdent<'S', 'E', 'E', 'D', 1>;

// Records of every simple type, a block of mixed records, an empty block and a
// block as the gridded files store their data.
void writeBody(FileHandle f) {
    const float floats[3] = {1.5f, -2.0f, 1e-35f};
    const double doubles[2] = {3.25, -1e-255};
    const char text[] = "tova";
    const int32_t ints[2] = {-7, 2147483647};
    const uint32_t uints[1] = {0xDEADBEEFu};
    const int16_t shorts[3] = {1, -2, 300};
    const uint16_t ushorts[2] = {65535, 7};
    rcfLrecWrite(f, RCF_FLOAT, 3, floats);
    rcfLrecWrite(f, RCF_DOUBLE, 2, doubles);
    rcfLrecWrite(f, RCF_BYTE, sizeof text, text);
    rcfLrecWrite(f, RCF_INT4, 2, ints);
    rcfLrecWrite(f, RCF_UINT4, 1, uints);
    rcfLrecWrite(f, RCF_INT2, 3, shorts);
    rcfLrecWrite(f, RCF_UINT2, 2, ushorts);

    LrecNode* block = FCreateLogicalBlock(RCF_DOUBLE, 2, doubles);
    FAppendToLogicalBlock(RCF_FLOAT, 1, floats, block);
    FAppendToLogicalBlock(RCF_UINT2, 2, ushorts, block);
    grdCheckWriteLB(nullptr, 10007, block, f, "make_corpus", __LINE__);
    FFreeLogicalBlock(block);
    rcfBlockWrite(50000, f, nullptr);
    float values[16];
    for (int i = 0; i < 16; ++i) values[i] = static_cast<float>(i) * 0.5f;
    block = FCreateLogicalBlock(RCF_FLOAT, 16, values);
    rcfBlockWrite(50001, f, block);
    FFreeLogicalBlock(block);
    rcfLrecWrite(f, RCF_INT2, 1, shorts);
}

// The body as written into a file of the given header, header cut off.
Bytes body(bool swapped) {
    const fs::path temp = g_out / ".body";
    FileHandle f = nullptr;
    check(rcfFileOpenCreate(temp.string().c_str(), "", &f, seedApp, 1) == 0, "rcf create");
    if (!swapped) {
        writeBody(f);
        check(rcfPeekError(f) == 0, "rcf body");
        const uint32_t base = rcfGetAppBase(f);
        rcfFileClose(&f);
        Bytes bytes = readFile(temp);
        fs::remove(temp);
        return Bytes(bytes.begin() + base, bytes.end());
    }
    const uint32_t base = rcfGetAppBase(f);
    rcfFileClose(&f);
    // The opposite byte order: reverse the tag and the application tag, then
    // let the writer (which swaps every element for such a file) add the body.
    Bytes header = readFile(temp);
    std::swap(header[0], header[3]);
    std::swap(header[1], header[2]);
    std::swap(header[4], header[7]);
    std::swap(header[5], header[6]);
    writeFile(temp, header);
    uint32_t tag = 0;
    check(rcfFileOpenEdit(temp.string().c_str(), &f, seedApp, &tag) == 0, "rcf edit of a swapped file");
    writeBody(f);
    check(rcfPeekError(f) == 0, "rcf swapped body");
    rcfFileClose(&f);
    Bytes bytes = readFile(temp);
    fs::remove(temp);
    return Bytes(bytes.begin() + base, bytes.end());
}

// flags: bit 0 opposite order, bit 1 edit; script ops: low 4 bits the
// operation, high 4 bits its argument (see fuzz_rcf.cpp).
void rcfSeed(const char* name, unsigned flags, const Bytes& script, const Bytes& content) {
    Bytes bytes;
    bytes.push_back(static_cast<uint8_t>(flags | (script.size() << 2)));
    bytes.insert(bytes.end(), script.begin(), script.end());
    bytes.insert(bytes.end(), content.begin(), content.end());
    writeFile(g_out / "fuzz_rcf" / name, bytes);
}

void rcfSeeds() {
    const Bytes native = body(false);
    const Bytes swapped = body(true);
    rcfSeed("walk", 0, {}, native);
    rcfSeed("walk-swapped", 1, {}, swapped);
    // query, read, typed reads, skip, block read, tell, seek, peek, fileio.
    rcfSeed("read-script", 0, {0x00, 0x01, 0x12, 0x22, 0x03, 0x04, 0x06, 0x07, 0x09, 0x0D, 0x1E, 0x0F}, native);
    rcfSeed("skip-script", 1, {0x03, 0x05, 0x0E, 0x1F, 0x2F, 0x0A, 0x08, 0x9F, 0x06}, swapped);
    // Writes after reads, a block write, seeks to the end.
    rcfSeed("edit-script", 2, {0x01, 0x1B, 0x06, 0x3C, 0xF7, 0x0B, 0x07, 0x04, 0x08}, native);
    rcfSeed("edit-swapped", 3, {0x04, 0x2B, 0x5C, 0x07, 0x01, 0x3F}, swapped);
}

// ---- Cross-section files -----------------------------------------------------

void fill(XsecHandle x, double seed, uint16_t raw, uint16_t sel, uint16_t prc, uint16_t coords) {
    check(xfsXsecSetNoRaw(x, raw) == 1 && xfsXsecSetNoSel(x, sel) == 1 && xfsXsecSetNoPrc(x, prc) == 1 &&
              xfsXsecSetNoCoords(x, coords) == 1,
          "xfs set counts");
    for (uint16_t i = 0; i < raw; ++i) {
        for (int c = 0; c < 3; ++c) x->raw[c][i] = seed + c + i * 0.5;
        x->raw3[i] = -seed;
        x->rawMark[0][i] = i;
        x->rawMark[1][i] = static_cast<uint16_t>(65535 - i);
    }
    for (uint16_t i = 0; i < sel; ++i) x->sel[i] = i;
    for (uint16_t i = 0; i < prc; ++i) {
        for (int c = 0; c < 6; ++c) x->prc[c][i] = seed * 10 + c;
    }
    for (uint16_t i = 0; i < coords; ++i) {
        for (int c = 0; c < 3; ++c) x->coords[c][i] = 1000.0 * c + i;
    }
}

struct XsecSpec {
    const char* primary;
    double key;
    const char* secondary;
    const char* extra;
    uint16_t raw, sel, prc, coords;
};

void xfsFile(const char* name, std::initializer_list<XsecSpec> sections) {
    Seed seed("fuzz_xfs", name);
    FileHandle f = nullptr;
    check(xfsFileOpenCreate(seed.path(), &f) == 0, "xfs create");
    for (const XsecSpec& s : sections) {
        XsecHandle x = xfsXsecCreateEx(s.primary, s.key, s.secondary, s.extra);
        check(x != nullptr, "xfs cross section");
        if (x == nullptr) continue;
        fill(x, s.key, s.raw, s.sel, s.prc, s.coords);
        x->headerWords[0] = 42;
        x->headerValues[0] = 0.125;
        check(xfsXsecWrite(x, f) == 0, "xfs write");
        xfsXsecFree(&x);
    }
    check(xfsFileClose(&f) == 0, "xfs close");
}

// An older file: three-record keys, short header records and a raw block of
// three columns, written block by block.
void xfsOldFile() {
    Seed seed("fuzz_xfs", "version101");
    FileHandle f = nullptr;
    check(rcfFileOpenCreate(seed.path(), "", &f, appIdent<'X', 'F', 'S', '_', 101>, 0) == 0, "xfs old create");
    const double key = 2.5;
    uint16_t words[20] = {};
    double values[10] = {};
    for (int i = 0; i < 20; ++i) words[i] = static_cast<uint16_t>(i);
    for (int i = 0; i < 10; ++i) values[i] = i * 0.5;
    const double raw[3][2] = {{1, 2}, {3, 4}, {5, 6}};
    LrecNode* block = FCreateLogicalBlock(RCF_BYTE, 5, "river");
    FAppendToLogicalBlock(RCF_DOUBLE, 1, &key, block);
    FAppendToLogicalBlock(RCF_BYTE, 3, "km5", block);
    rcfBlockWrite(257, f, block);
    FFreeLogicalBlock(block);
    block = FCreateLogicalBlock(RCF_UINT2, 16, words);
    FAppendToLogicalBlock(RCF_DOUBLE, 9, values, block);
    rcfBlockWrite(258, f, block);
    FFreeLogicalBlock(block);
    block = FCreateLogicalBlock(RCF_DOUBLE, 2, raw[0]);
    FAppendToLogicalBlock(RCF_DOUBLE, 2, raw[1], block);
    FAppendToLogicalBlock(RCF_DOUBLE, 2, raw[2], block);
    rcfBlockWrite(259, f, block);
    FFreeLogicalBlock(block);
    check(rcfPeekError(f) == 0, "xfs old write");
    rcfFileClose(&f);
}

void xfsSeeds() {
    xfsFile("three-sections", {{"river", 1.0, "km1", "upstream", 3, 2, 2, 2},
                               {"river", 2.0, "km1", nullptr, 0, 1, 0, 3},
                               {"River", 2.0, "KM1", "", 2, 0, 1, 0}});
    xfsFile("descending-no-data", {{"c", 3.0, "x", nullptr, 0, 0, 0, 0},
                                   {"b", 2.0, "x", nullptr, 0, 0, 0, 0},
                                   {"a", 1.0, "x", nullptr, 0, 0, 0, 0}});
    xfsFile("empty", {});
    xfsOldFile();
}

// ---- VRE files -----------------------------------------------------------------

void vreSmall() {
    Seed seed("fuzz_vre", "small");
    VreHandle h = vreHandleCreate();
    const int32_t params[8] = {1, 2, 0, 2, 2, 5, 1, 1};
    for (int32_t i = 0; i < 8; ++i) {
        if (i != 2) vreSetVectorParam(h, i, params[i]);
    }
    const int32_t panels[2] = {2, 1};
    vreSetBodyPanelCount(h, panels);
    std::vector<char> names(2 * VRE_NAME_LENGTH, '\0');
    std::strcpy(names.data(), "hull");
    std::strcpy(names.data() + VRE_NAME_LENGTH, "buoy");
    vreSetBodyNames(h, names.data());
    vreSetSymmetry(h, 0, 1);
    vreSetScalarItem(h, 1, 1025.0);
    for (int32_t i = 0; i < VRE_VECTOR_ITEMS; ++i) {
        std::vector<double> values(64);
        for (size_t k = 0; k < values.size(); ++k) values[k] = i + k * 0.125;
        vreSetVectorItem(h, i, values.data());
    }
    check(vreFileWrite(seed.path(), h) == 0, "vre write");
    vreHandleFree(h);
}

void vreDefaults() {
    Seed seed("fuzz_vre", "defaults");
    VreHandle h = vreHandleCreate();
    check(vreFileWrite(seed.path(), h) == 0, "vre write defaults");
    vreHandleFree(h);
}

// Version 100: no size parameter 5, no names, items 16-20 absent, item 15
// last. B = 1, one panel, N0 = N3 = N4 = 1.
void vreVersion100() {
    Seed seed("fuzz_vre", "version100");
    FileHandle f = nullptr;
    check(rcfFileOpenCreate(seed.path(), "", &f, appIdent<'V', 'R', 'E', '_', 100>, 0) == 0, "vre old create");
    auto putInt = [&](int32_t v) { rcfLrecWrite(f, RCF_INT4, 1, &v); };
    auto group = [&](int32_t index, int32_t count) {
        putInt(index);
        putInt(0);  // not a unit of any quantity: the default unit stays
        std::vector<double> values(static_cast<size_t>(count), index + 0.5);
        rcfLrecWrite(f, RCF_DOUBLE, static_cast<uint32_t>(count), values.data());
    };
    putInt(1);  // N0
    group(0, 12);
    putInt(1);  // B
    const int32_t symmetry[2] = {1, 0};
    rcfLrecWrite(f, RCF_INT4, 2, symmetry);
    putInt(1);  // N3
    putInt(1);  // panel counts
    group(1, 3);
    group(2, 1);
    group(3, 3);
    group(4, 1);
    putInt(1);  // N4
    for (int32_t s = 0; s < 2; ++s) {
        putInt(s);
        putInt(0);
        const double v = 9.81 + s;
        rcfLrecWrite(f, RCF_DOUBLE, 1, &v);
    }
    const int32_t counts[11] = {3, 3, 1, 1, 1, 1, 9, 1, 1, 1, 1};
    for (int32_t i = 5; i <= 15; ++i) group(i, counts[i - 5]);
    check(rcfPeekError(f) == 0, "vre old write");
    rcfFileClose(&f);
}

void vreSeeds() {
    vreSmall();
    vreDefaults();
    vreVersion100();
}


// ---- Gridded data files -----------------------------------------------------

// WaterLevel in metres: an item whose values the unit conversion modes change.
constexpr int32_t kWaterLevel = 40101;
constexpr int32_t kMetre = 20100;

void ok(int32_t status, const char* what) { check(status == 0, what); }

// Item n of the header: name, quantity, unit, data type; the axis is set by
// the caller.
ItemHandle grdItem(HeaderHandle h, int32_t n, int32_t dataType, bool waterLevel = false) {
    ItemHandle item = grdItemD(h, n);
    const std::string name = "item " + std::to_string(n);
    ok(grdSetItemInfo(h, item, waterLevel ? kWaterLevel : QTY_ITEM_UNDEFINED, name.c_str(),
                      waterLevel ? kMetre : 0, dataType),
       "grd item info");
    return item;
}

// A static item of count values first, first + 1, ... (float or double) on
// an equidistant 1-D axis (a single value when count is 1).
void grdStatic(HeaderHandle h, FileHandle f, const char* name, int32_t dataType, int32_t count, double first) {
    ItemHandle item = nullptr;
    ok(grdStaticCreate(&item), "grd static create");
    ok(grdSetItemInfo(h, item, QTY_ITEM_UNDEFINED, name, 0, dataType), "grd static info");
    ok(count == 1 ? grdSetItemAxisEqD0(item, 0) : grdSetItemAxisEqD1(item, 0, count, 0.0f, 2.0f), "grd static axis");
    std::vector<double> doubles(static_cast<size_t>(count));
    std::vector<float> floats(static_cast<size_t>(count));
    for (int32_t k = 0; k < count; ++k) {
        doubles[size_t(k)] = first + k;
        floats[size_t(k)] = static_cast<float>(first + k);
    }
    ok(grdStaticWrite(item, f, dataType == RCF_DOUBLE ? static_cast<const void*>(doubles.data()) : floats.data()),
       "grd static write");
    grdStaticDestroy(&item);
}

// Writes steps time steps of every item: item i, step s, element e holds
// s * 100 + i * 10 + e / 4 (a delete value at element 1 of every third step),
// with the time times[s].
void grdSteps(HeaderHandle h, FileHandle f, const std::vector<double>& times) {
    for (size_t s = 0; s < times.size(); ++s) {
        for (int32_t i = 1; i <= grdGetNoOfItems(h); ++i) {
            ItemHandle item = grdItemD(h, i);
            int32_t dataType = 0;
            grdGetItemInfo_(item, nullptr, nullptr, nullptr, &dataType);
            const auto n = static_cast<size_t>(grdGetItemElements(item));
            std::vector<double> doubles(n);
            std::vector<float> floats(n);
            for (size_t e = 0; e < n; ++e) {
                doubles[e] = double(s) * 100 + i * 10 + double(e) / 4;
                floats[e] = static_cast<float>(doubles[e]);
            }
            if (s % 3 == 2 && n > 1) {
                doubles[1] = grdGetDeleteValDouble(h);
                floats[1] = grdGetDeleteValFloat(h);
            }
            const void* values = dataType == RCF_DOUBLE ? static_cast<const void*>(doubles.data()) : floats.data();
            ok(grdWriteItemTimeStep(h, f, times[s], values), "grd time step");
        }
    }
}

// Creates the seed file of a filled header: static items by statics, then
// the time steps, then closes it.
template <class Statics>
void grdFile(const char* name, HeaderHandle h, const std::vector<double>& times, Statics statics,
             const char* target = "fuzz_grd") {
    {
        Seed seed(target, name);
        FileHandle f = nullptr;
        ok(grdFileCreate(seed.path(), h, &f), "grd create");
        if (f != nullptr) {
            statics(f);
            grdSteps(h, f, times);
            ok(grdFileClose(h, &f), "grd close");
        }
    }
    grdHeaderDestroy(&h);
}

HeaderHandle grdHeader(int32_t fileType, int32_t items, int32_t statsType) {
    HeaderHandle h = nullptr;
    ok(grdHeaderCreate(fileType, "seed file", "make_corpus", 3, items, statsType, &h), "grd header");
    return h;
}

// File type 1, equidistant time axis: a float grid on a 2-D axis and a
// double profile on a 1-D axis, item-global statistics, one static item.
void grdEquidistant() {
    HeaderHandle h = grdHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 2, F_ITEM_STATS_GLOBAL);
    ok(grdSetEqTimeAxis(h, QTY_UNIT_SECOND, 0.0, 60.0, 0), "grd time axis");
    ok(grdSetItemAxisEqD2(grdItem(h, 1, RCF_FLOAT, true), 0, 3, 2, 0.0f, 0.0f, 10.0f, 10.0f), "grd axis");
    ok(grdSetItemAxisEqD1(grdItem(h, 2, RCF_DOUBLE), 0, 4, 1.0f, 0.5f), "grd axis");
    grdFile("eq-time-d2-d1", h, {0, 1, 2}, [&](FileHandle f) { grdStatic(h, f, "bathymetry", RCF_FLOAT, 6, -3.0); });
}

// File type 4 on a non-equidistant calendar axis with per-element
// statistics: a single value and a non-equidistant 1-D profile; two static
// items, a projection and a custom block.
void grdCalendar() {
    HeaderHandle h = grdHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 2, F_ITEM_STATS_ELEMENT);
    ok(grdSetNeqCalendarAxis(h, "2020-02-28", "23:00:00", QTY_UNIT_SECOND, 0.0, 0), "grd calendar axis");
    ok(grdSetGeoInfoUTMProj(h, "UTM-32", 9.0, 54.5, 0.0), "grd projection");
    const int32_t marks[3] = {7, -1, 300};
    ok(grdAddCustomBlock(h, RCF_INT4, "marks", 3, marks), "grd custom block");
    ok(grdSetItemAxisEqD0(grdItem(h, 1, RCF_DOUBLE, true), 0), "grd axis");
    const double xs[4] = {0.0, 1.0, 3.0, 7.5};
    ok(grdSetItemAxisNeqD1(grdItem(h, 2, RCF_FLOAT), 0, 3, xs, 0), "grd axis");
    grdFile("neq-calendar-stats", h, {0.0, 1800.0, 5400.0, 90000.0}, [&](FileHandle f) {
        grdStatic(h, f, "depth", RCF_DOUBLE, 3, 10.0);
        grdStatic(h, f, "level", RCF_FLOAT, 1, 0.5);
    });
}

// File type 1 on an equidistant calendar axis, compressed through x and y
// encoding keys (written as the first static items): a float and a double
// grid on 2-D axes of which the keys hold 5 of 12 points, and an
// uncompressed single value. Per-element statistics.
void grdCompressed() {
    HeaderHandle h = grdHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 3, F_ITEM_STATS_ELEMENT);
    ok(grdSetEqCalendarAxis(h, "2024-03-21", "06:00:00", QTY_UNIT_SECOND, 0.0, 1800.0, 0), "grd calendar axis");
    const int32_t xKey[5] = {0, 3, 1, 2, 0};
    const int32_t yKey[5] = {0, 0, 1, 2, 2};
    ok(grdSetEncodeKey(h, xKey, yKey, nullptr, 5), "grd encoding keys");
    ok(grdSetItemAxisEqD2(grdItem(h, 1, RCF_FLOAT, true), 0, 4, 3, 0.0f, 0.0f, 1.0f, 1.0f), "grd axis");
    ok(grdSetItemAxisEqD2(grdItem(h, 2, RCF_DOUBLE), 0, 4, 3, 0.0f, 0.0f, 1.0f, 1.0f), "grd axis");
    ok(grdSetItemAxisEqD0(grdItem(h, 3, RCF_FLOAT), 0), "grd axis");
    grdFile("compressed-eq-calendar", h, {0, 1, 2}, [](FileHandle) {});
}

// File type 4 on a non-equidistant time axis: no static items, many short
// time steps (searches jump over them).
void grdManySteps() {
    HeaderHandle h = grdHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 2, F_ITEM_STATS_GLOBAL);
    ok(grdSetNeqTimeAxis(h, QTY_UNIT_SECOND, 0.0, 0), "grd time axis");
    ok(grdSetItemAxisEqD0(grdItem(h, 1, RCF_FLOAT), 0), "grd axis");
    ok(grdSetItemAxisEqD1(grdItem(h, 2, RCF_DOUBLE, true), 0, 2, 0.0f, 1.0f), "grd axis");
    std::vector<double> times;
    for (int s = 0; s < 12; ++s) times.push_back(s * 2.5 + (s % 2));
    grdFile("neq-time-many-steps", h, times, [](FileHandle) {});
}

// A header with static items and no dynamic data.
void grdStaticOnly() {
    HeaderHandle h = grdHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 1, F_ITEM_STATS_ELEMENT);
    ok(grdSetEqTimeAxis(h, QTY_UNIT_SECOND, 0.0, 1.0, 0), "grd time axis");
    ok(grdSetItemAxisEqD1(grdItem(h, 1, RCF_FLOAT), 0, 2, 0.0f, 1.0f), "grd axis");
    grdFile("static-only", h, {}, [&](FileHandle f) {
        grdStatic(h, f, "a", RCF_DOUBLE, 4, 1.0);
        grdStatic(h, f, "b", RCF_FLOAT, 2, -1.0);
    });
}

void grdSeeds() {
    grdEquidistant();
    grdCalendar();
    grdCompressed();
    grdManySteps();
    grdStaticOnly();
}

// ---- Plug-in: files of data type 7 with velocity components ------------------

constexpr int32_t kVelocityX = 40202;
constexpr int32_t kVelocityY = 40203;
constexpr int32_t kMetrePerSecond = 20700;

void velocity(HeaderHandle h, int32_t n, int32_t quantity, int32_t dataType) {
    ok(grdSetItemInfo(h, grdItemD(h, n), quantity, quantity == kVelocityX ? "u" : "v", kMetrePerSecond, dataType),
       "grd velocity info");
}

// Float components on a 2-D grid after a water level, equidistant time axis.
void pluginGrid() {
    HeaderHandle h = grdHeader(F_EQTIME_FIXEDSPACE_ALLITEMS, 3, F_ITEM_STATS_GLOBAL);
    ok(grdSetDataType(h, 7), "grd data type");
    ok(grdSetEqTimeAxis(h, QTY_UNIT_SECOND, 0.0, 600.0, 0), "grd time axis");
    ok(grdSetItemAxisEqD2(grdItem(h, 1, RCF_FLOAT, true), 0, 3, 2, 0.0f, 0.0f, 10.0f, 10.0f), "grd axis");
    velocity(h, 2, kVelocityX, RCF_FLOAT);
    velocity(h, 3, kVelocityY, RCF_FLOAT);
    for (int32_t n : {2, 3}) ok(grdSetItemAxisEqD2(grdItemD(h, n), 0, 3, 2, 0.0f, 0.0f, 10.0f, 10.0f), "grd axis");
    grdFile("velocity-float-d2", h, {0, 1, 2}, [](FileHandle) {}, "fuzz_plugin");
}

// Double components on a 1-D profile, non-equidistant calendar axis, data
// type -7, per-element statistics.
void pluginProfile() {
    HeaderHandle h = grdHeader(F_NEQTIME_FIXEDSPACE_ALLITEMS, 2, F_ITEM_STATS_ELEMENT);
    ok(grdSetDataType(h, -7), "grd data type");
    ok(grdSetNeqCalendarAxis(h, "2024-02-29", "12:00:00", QTY_UNIT_SECOND, 0.0, 0), "grd calendar axis");
    velocity(h, 1, kVelocityX, RCF_DOUBLE);
    velocity(h, 2, kVelocityY, RCF_DOUBLE);
    for (int32_t n : {1, 2}) ok(grdSetItemAxisEqD1(grdItemD(h, n), 0, 4, 0.0f, 5.0f), "grd axis");
    grdFile("velocity-double-d1-calendar", h, {0.0, 30.0, 3630.0}, [](FileHandle) {}, "fuzz_plugin");
}

void pluginSeeds() {
    pluginGrid();
    pluginProfile();
}

// ---- Tool: the files of every kind, and a gridded file cut inside a step ---------

void toolSeeds() {
    fs::create_directories(g_out / "fuzz_tool");
    for (const char* target : {"fuzz_grd", "fuzz_xfs", "fuzz_vre", "fuzz_plugin"}) {
        for (const auto& entry : fs::directory_iterator(g_out / target)) {
            const std::string name = entry.path().filename().string();
            fs::copy_file(entry.path(), g_out / "fuzz_tool" / (std::string(target).substr(5) + "-" + name),
                          fs::copy_options::overwrite_existing);
        }
    }
    // A writer killed inside its last time step: repair has work to do.
    Bytes cut = readFile(g_out / "fuzz_grd" / "eq-time-d2-d1");
    cut.resize(cut.size() - 20);
    writeFile(g_out / "fuzz_tool" / "grd-cut-inside-a-step", cut);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: make_corpus OUTDIR\n");
        return 2;
    }
    g_out = argv[1];
    fs::create_directories(g_out);
    // Each target's seeds.
    rcfSeeds();
    xfsSeeds();
    vreSeeds();
    grdSeeds();
    pluginSeeds();
    toolSeeds();
    return g_failures == 0 ? 0 : 1;
}
