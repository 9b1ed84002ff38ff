// `tova check`: sound files pass with their record and block counts; each
// kind of structural damage is reported at its offset with exit status 1;
// truncated, bit-flipped and random files never crash the tool.
#include <gtest/gtest.h>

#include <cstring>
#include <random>
#include <set>

#include "rcf/rcf_internal.h"
#include "tool_test.h"

using tooltest::runTova;

namespace {

using Bytes = std::vector<uint8_t>;

Bytes record(int8_t type, uint32_t count, size_t elementSize) {
    Bytes b{static_cast<uint8_t>(type), 0, 0, 0, 0};
    std::memcpy(&b[1], &count, 4);
    for (size_t i = 0; i < count * elementSize; ++i) b.push_back(static_cast<uint8_t>(i));
    return b;
}

Bytes blockStart(uint16_t id) { return {0xFE, static_cast<uint8_t>(id & 0xFF), static_cast<uint8_t>(id >> 8)}; }

Bytes concat(std::initializer_list<Bytes> parts) {
    Bytes all;
    for (const Bytes& p : parts) all.insert(all.end(), p.begin(), p.end());
    return all;
}

uint32_t xfsIdent(uint32_t* version) {
    *version = 106;
    uint32_t tag = 0;
    std::memcpy(&tag, "XFS_", 4);
    return tag;
}

// A record file whose body is the given bytes: of no known application, or
// with the given application callback.
void writeRawFile(const std::string& path, Bytes body, const char* appText = "", rcfAppIdent app = nullptr) {
    FileHandle f = nullptr;
    ASSERT_EQ(rcfFileOpenCreate(path.c_str(), appText, &f, app, 0), 0);
    if (!body.empty()) rcfWriteRaw(body.data(), 1, static_cast<uint32_t>(body.size()), f);
    ASSERT_EQ(rcfFileClose(&f), 0);
}

// "<path>: damaged at offset N: ..." -> N, or -1.
int64_t damagedOffset(const tooltest::Run& run) {
    const size_t at = run.out.find("damaged at offset ");
    return at == std::string::npos ? -1 : std::stoll(run.out.substr(at + 18));
}

std::string okLine(const tooltest::Layout& layout, uint64_t size) {
    return "OK: " + std::to_string(layout.records) + " records in " + std::to_string(layout.blocks) + " blocks, " +
           std::to_string(size) + " bytes\n";
}

bool endsWith(const std::string& s, const std::string& tail) {
    return s.size() >= tail.size() && s.compare(s.size() - tail.size(), tail.size(), tail) == 0;
}

}  // namespace

TEST(ToolCheck, SoundFilesPassWithTheirCounts) {
    testutil::TempDir dir;
    const std::string vre = dir.file("a.vre");
    const std::string grd = dir.file("a.grd");
    const std::string raw = dir.file("a.rcf");
    const std::string xfs = dir.file("a.xfs");
    tooltest::writeXsecFile(xfs);
    tooltest::writeVreFile(vre);
    tooltest::writeGridFile(grd);
    writeRawFile(raw, concat({record(1, 3, 4), blockStart(7), record(2, 1, 8), {0xFF}, blockStart(8), {0xFF}}));

    for (const std::string& path : {vre, grd, raw, xfs}) {
        const tooltest::Run run = runTova({"check", path});
        EXPECT_EQ(run.exitCode, 0) << path << "\n" << run.out << run.err;
        EXPECT_TRUE(endsWith(run.out, okLine(tooltest::walkLayout(path), testutil::readBytes(path).size()))) << run.out;
    }
    EXPECT_NE(runTova({"check", raw}).out.find("unknown application"), std::string::npos);
}

TEST(ToolCheck, ReportsEachKindOfDamageAtItsOffset) {
    testutil::TempDir dir;
    const std::string path = dir.file("d.rcf");
    const int64_t body = 113;  // appBase of a file without application text
    struct Case {
        Bytes bytes;
        int64_t offset;
        const char* phrase;
    };
    const std::vector<Case> cases = {
        {concat({record(4, 1, 4), {0x09, 1, 0, 0, 0, 0}}), 9, "unknown record type byte 0x09"},
        {concat({record(4, 1, 4), {0x00}}), 9, "unknown record type byte 0x00"},
        {concat({record(4, 1, 4), {0x80}}), 9, "unknown record type byte 0x80"},
        {concat({record(4, 1, 4), {0x02, 4, 0, 0, 0}, Bytes(10, 0)}), 9, "needs 37 bytes, only 15 remain"},
        {concat({record(2, 4, 8), {0x02, 0xFF, 0xFF, 0xFF, 0x7F}, Bytes(64, 0)}), 37, "only 69 remain"},
        {concat({record(4, 1, 4), {0x02, 0x01}}), 9, "needs 5 bytes, the file ends after 2"},
        {concat({record(4, 1, 4), {0xFE, 0x01}}), 9, "block start needs 3 bytes"},
        {concat({record(4, 1, 4), {0xFF}}), 9, "terminator without a block start"},
        {concat({blockStart(10), record(4, 1, 4), blockStart(11), {0xFF}}), 12, "starts inside block 10"},
        {concat({record(3, 2, 1), blockStart(12), record(4, 1, 4)}), 7, "block 12 has no terminator"},
        {concat({blockStart(12), {0x04, 0, 0, 0, 0}, {0xFF}}), 3, "at least one element"},
    };
    for (const Case& c : cases) {
        writeRawFile(path, c.bytes);
        const tooltest::Run run = runTova({"check", path});
        EXPECT_EQ(run.exitCode, 1) << c.phrase << "\n" << run.out;
        EXPECT_EQ(damagedOffset(run), body + c.offset) << c.phrase << "\n" << run.out;
        EXPECT_NE(run.out.find(c.phrase), std::string::npos) << run.out;
    }

    // The fixed header (here with an application text: rcfBase is 82).
    struct HeaderCase {
        uint64_t offset;  // of the damaged byte
        int64_t reported;
        const char* phrase;
    };
    const std::vector<HeaderCase> headerDamage = {{20, 20, "banner"},
                                                  {64, 64, "two blanks"},
                                                  {70, 70, "application text of the file header holds the byte"},
                                                  {82 + 45, 82 + 44, "reserved word"},
                                                  {82 + 1, 82, "creation stamp"},
                                                  {82 + 29, 82 + 20, "edit stamp"}};
    for (const HeaderCase& c : headerDamage) {
        writeRawFile(path, {}, "FOpenFileCreate");
        Bytes bytes = testutil::readBytes(path);
        bytes[c.offset] ^= 0x80;
        testutil::writeBytes(path, bytes);
        const tooltest::Run run = runTova({"check", path});
        EXPECT_EQ(run.exitCode, 1) << c.phrase << "\n" << run.out;
        EXPECT_EQ(damagedOffset(run), c.reported) << run.out;
        EXPECT_NE(run.out.find(c.phrase), std::string::npos) << run.out;
    }

    const std::vector<std::pair<Bytes, const char*>> notRecordFiles = {
        {{}, "empty"}, {{'Q', 'T'}, "too short"}, {{'Q', 'T', 'B', '_', 0, 0, 0, 0, 0}, "does not begin with"}};
    for (const auto& [bytes, phrase] : notRecordFiles) {
        testutil::writeBytes(path, bytes);
        const tooltest::Run run = runTova({"check", path});
        EXPECT_EQ(run.exitCode, 1);
        EXPECT_EQ(damagedOffset(run), 0) << run.out;
        EXPECT_NE(run.out.find(phrase), std::string::npos) << run.out;
    }

    const tooltest::Run missing = runTova({"check", dir.file("missing.vre")});
    EXPECT_EQ(missing.exitCode, 1);
    EXPECT_NE(missing.err.find("cannot open"), std::string::npos) << missing.err;
    EXPECT_EQ(runTova({"check", dir.path().string()}).exitCode, 1);
}

TEST(ToolCheck, VreRecordsMustFollowTheirSequence) {
    testutil::TempDir dir;
    const std::string path = dir.file("a.vre");
    tooltest::writeVreFile(path);
    const tooltest::Layout layout = tooltest::walkLayout(path);
    // Records: 0 N0, 1 index of item 0, 2 its unit, 3 its values, 4 parameter 5, ...
    const auto valueOffset = [&](size_t record) { return static_cast<uint64_t>(layout.headers[record].second); };

    struct Case {
        size_t record;
        Bytes value;
        const char* phrase;
    };
    const std::vector<Case> cases = {
        {1, {7, 0, 0, 0}, "index field says 7"},
        {2, {0xA0, 0x86, 0x01, 0}, "is not a unit of its quantity BodyCoordinate"},
        {0, {2, 0, 0, 0}, "item 0 values: expected a double record of 24 elements"},
        {4, {0xFF, 0xFF, 0xFF, 0xFF}, "size parameter 5 (parameter 5) is negative"},
    };
    for (const Case& c : cases) {
        tooltest::writeVreFile(path);
        tooltest::patchBytes(path, valueOffset(c.record), c.value);
        const tooltest::Run run = runTova({"check", path});
        EXPECT_EQ(run.exitCode, 1) << c.phrase;
        EXPECT_NE(run.out.find(c.phrase), std::string::npos) << run.out;
    }

    // A record of another type of the same size, and a record too many.
    tooltest::writeVreFile(path);
    tooltest::patchBytes(path, static_cast<uint64_t>(layout.headers[0].first), {RCF_UINT4});
    tooltest::Run run = runTova({"check", path});
    EXPECT_EQ(damagedOffset(run), layout.headers[0].first) << run.out;
    EXPECT_NE(run.out.find("found an unsigned*4 record"), std::string::npos) << run.out;

    tooltest::writeVreFile(path);
    const uint64_t size = testutil::readBytes(path).size();
    tooltest::patchBytes(path, size, record(4, 1, 4));
    run = runTova({"check", path});
    EXPECT_EQ(damagedOffset(run), static_cast<int64_t>(size)) << run.out;
    EXPECT_NE(run.out.find("records follow the end"), std::string::npos) << run.out;
}

TEST(ToolCheck, CrossSectionBlocksMustHoldWhatTheirTagSays) {
    testutil::TempDir dir;
    const std::string path = dir.file("x.xfs");
    const Bytes key = concat({blockStart(257), record(3, 5, 1), record(2, 1, 8), record(3, 4, 1), {0xFF}});
    const Bytes header = concat({blockStart(258), record(7, 25, 2), record(2, 23, 8), {0xFF}});
    ASSERT_EQ(key.size(), 36u);
    ASSERT_EQ(header.size(), 248u);
    struct Case {
        Bytes bytes;
        int64_t offset;
        const char* phrase;
    };
    const std::vector<Case> cases = {
        {concat({blockStart(260), record(2, 1, 8), {0xFF}}), 0, "a selection block outside any cross section"},
        {concat({key, key, header}), 0, "a key block without a header block"},
        {concat({key, header, key}), 284, "the last key block has no header block"},
        {concat({key, header, record(4, 1, 4)}), 284, "an integer*4 record of 1 element outside any block"},
        {concat({key, header, blockStart(300), {0xFF}}), 284, "block 300 is no block of cross-section files"},
        {concat({key, blockStart(258), record(7, 20, 2), record(2, 23, 8), {0xFF}}), 39,
         "20 header words, format version 106 has 25"},
        {concat({key, header, blockStart(262), record(2, 2, 8), record(2, 2, 8), record(2, 3, 8), {0xFF}}), 284 + 45,
         "its columns differ in length (3 and 2)"},
        {concat({key, header, blockStart(259), record(2, 1, 8), record(2, 1, 8), {0xFF}}), 284,
         "the raw-point block holds 2 records, 6 are due"},
    };
    for (const Case& c : cases) {
        writeRawFile(path, c.bytes, "", xfsIdent);
        const tooltest::Run run = runTova({"check", path});
        EXPECT_EQ(run.exitCode, 1) << c.phrase << "\n" << run.out;
        EXPECT_EQ(damagedOffset(run), 113 + c.offset) << c.phrase << "\n" << run.out;
        EXPECT_NE(run.out.find(c.phrase), std::string::npos) << run.out;
    }
    writeRawFile(path, concat({key, header}), "", xfsIdent);
    EXPECT_EQ(runTova({"check", path}).exitCode, 0);
}

namespace {

// Lengths to cut a sound file to: samples of the file header, every length
// near the start of the body and within each record header, and a stride
// over the rest (each run of the tool is a process start, slow when
// sanitized).
std::vector<uint64_t> cutLengths(const tooltest::Layout& layout, uint64_t size) {
    std::set<uint64_t> lengths;
    for (uint64_t n = 0; n < layout.appBase; n += 5) lengths.insert(n);
    for (uint64_t n = layout.appBase; n < size && n < layout.appBase + 48u; ++n) lengths.insert(n);
    for (uint64_t n = layout.appBase; n < size; n += 13) lengths.insert(n);
    for (const auto& [begin, end] : layout.headers) {
        if (end - begin > 1) lengths.insert(static_cast<uint64_t>(begin) + 1);
    }
    return {lengths.begin(), lengths.end()};
}

// Offsets of bytes to flip: samples of the file header, the type byte and
// one other byte of every record header, and a stride over the data.
std::vector<uint64_t> flipOffsets(const tooltest::Layout& layout, uint64_t size, std::mt19937& random) {
    std::set<uint64_t> offsets;
    for (uint64_t n = 0; n < layout.appBase; n += 3) offsets.insert(n);
    for (const auto& [begin, end] : layout.headers) {
        offsets.insert(static_cast<uint64_t>(begin));
        if (end - begin > 1) offsets.insert(static_cast<uint64_t>(begin) + 1 + random() % (end - begin - 1));
    }
    for (uint64_t n = layout.appBase; n < size; n += 17) offsets.insert(n);
    return {offsets.begin(), offsets.end()};
}

bool inHeader(const tooltest::Layout& layout, uint64_t offset) {
    for (const auto& [begin, end] : layout.headers) {
        if (static_cast<int64_t>(offset) >= begin && static_cast<int64_t>(offset) < end) return true;
    }
    return false;
}

// Bytes of the file header whose damage the check must always see: the tag,
// the banner and the rest of the text part, and the reserved words.
bool fixedHeader(const tooltest::Layout& layout, uint64_t offset) {
    return offset < 4 || (offset >= 8 && offset < layout.rcfBase) ||
           (offset >= layout.rcfBase + 40u && offset < layout.appBase);
}

// Cuts and bit flips of a sound file. strictCuts: every cut is damage (else
// a cut at a top-level boundary leaves a sound file). strictFlips: the kind's
// rules see every flip in a record header (else flips that give another
// record type of the same size, or another block identifier, may pass).
void checkDamagedCopies(const std::string& good, bool strictCuts, bool strictFlips) {
    const Bytes bytes = testutil::readBytes(good);
    const tooltest::Layout layout = tooltest::walkLayout(good);
    const std::set<int64_t> boundaries(layout.boundaries.begin(), layout.boundaries.end());
    const std::string copy = good + ".damaged";

    for (uint64_t n : cutLengths(layout, bytes.size())) {
        testutil::writeBytes(copy, Bytes(bytes.begin(), bytes.begin() + static_cast<std::ptrdiff_t>(n)));
        const tooltest::Run run = runTova({"check", copy});
        ASSERT_TRUE(run.clean()) << "cut to " << n << ": " << run.exitCode << " " << run.signal << "\n" << run.err;
        if (strictCuts || boundaries.count(static_cast<int64_t>(n)) == 0) {
            EXPECT_EQ(run.exitCode, 1) << "cut to " << n << "\n" << run.out;
        }
    }

    std::mt19937 random(12345);
    for (uint64_t offset : flipOffsets(layout, bytes.size(), random)) {
        Bytes flipped = bytes;
        flipped[offset] ^= static_cast<uint8_t>(1u << (random() % 8));
        testutil::writeBytes(copy, flipped);
        const tooltest::Run run = runTova({"check", copy});
        ASSERT_TRUE(run.clean()) << "flip at " << offset << ": " << run.exitCode << " " << run.signal << "\n"
                                 << run.err;
        EXPECT_LE(run.exitCode, 1) << "flip at " << offset;
        if (fixedHeader(layout, offset) || (strictFlips && inHeader(layout, offset))) {
            EXPECT_EQ(run.exitCode, 1) << "flip at " << offset << "\n" << run.out;
        }
    }
}

}  // namespace

TEST(ToolCheck, TruncatedAndBitFlippedVreFilesFailWithoutCrashing) {
    testutil::TempDir dir;
    tooltest::writeVreFile(dir.file("a.vre"));
    checkDamagedCopies(dir.file("a.vre"), true, true);
}

TEST(ToolCheck, TruncatedAndBitFlippedGridFilesFailWithoutCrashing) {
    testutil::TempDir dir;
    tooltest::writeGridFile(dir.file("a.grd"));
    checkDamagedCopies(dir.file("a.grd"), true, true);
}

TEST(ToolCheck, TruncatedAndBitFlippedCrossSectionFilesFailWithoutCrashing) {
    testutil::TempDir dir;
    tooltest::writeXsecFile(dir.file("a.xfs"));
    checkDamagedCopies(dir.file("a.xfs"), false, true);
}

TEST(ToolCheck, RandomBodiesNeverCrashTheTool) {
    testutil::TempDir dir;
    std::mt19937 random(777);
    for (int i = 0; i < 40; ++i) {
        Bytes body(random() % 300);
        for (uint8_t& b : body) b = static_cast<uint8_t>(random());
        // Bias towards record marks so that the walk gets somewhere.
        for (size_t k = 0; k < body.size(); k += 1 + random() % 9)
            body[k] = static_cast<uint8_t>(0xF8 + random() % 8 + 1);
        const std::string path = dir.file("r" + std::to_string(i));
        writeRawFile(path, body);
        const tooltest::Run run = runTova({"check", path});
        ASSERT_TRUE(run.clean()) << i << ": " << run.exitCode << " " << run.signal << "\n" << run.err;
    }
}
