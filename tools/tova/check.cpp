// `tova check FILE`: a structural check of any record file. It verifies the
// fixed file header byte by byte, then walks every record, block start and
// terminator through the public record-file API, making sure each record fits
// in the file, each type byte is known and blocks neither nest nor stay open.
// The rules of the file's kind follow (KindCheck), which also load the file
// through the kind's own API. The first problem is reported with its byte
// offset; the exit status is 1 for a damaged file.
#include <algorithm>
#include <cstdio>
#include <cstring>
#include <filesystem>
#include <fstream>
#include <memory>
#include <string_view>
#include <vector>

#include "check.h"
#include "grd_commands.h"
#include "handles.h"
#include "progress.h"
#include "text.h"
#include "tova/grd.h"
#include "tova/rcf.h"

namespace tova_cli {

std::string recordText(int32_t type, uint32_t count) {
    return std::string(rcfSimpName(type)) + " record of " + std::to_string(count) +
           (count == 1 ? " element" : " elements");
}

std::string withArticle(const std::string& phrase) {
    const bool vowel = !phrase.empty() && std::string_view("aeiouAEIOU").find(phrase[0]) != std::string_view::npos;
    return (vowel ? "an " : "a ") + phrase;
}

namespace {

constexpr char kBanner[] = " TOVA Deck - this file contains binary data, do not edit";
constexpr uint64_t kBannerOffset = 8;
constexpr uint64_t kBannerLength = sizeof(kBanner) - 1;
constexpr unsigned char kEndOfText = 0x1A;
constexpr uint64_t kStampBytes = 48;  // two stamp groups and two reserved words
constexpr uint64_t kMaxHeaderRead = 1u << 20;

std::string hexByte(unsigned char b) {
    char text[8];
    std::snprintf(text, sizeof(text), "0x%02x", b);
    return text;
}

std::vector<unsigned char> readBytes(const std::string& path, uint64_t offset, uint64_t length) {
    std::vector<unsigned char> bytes(static_cast<size_t>(length));
    std::ifstream in(path, std::ios::binary);
    in.seekg(static_cast<std::streamoff>(offset));
    in.read(reinterpret_cast<char*>(bytes.data()), static_cast<std::streamsize>(length));
    bytes.resize(static_cast<size_t>(std::max<std::streamsize>(in.gcount(), 0)));
    return bytes;
}

// Offset of the first 0x1A at or after from; -1 when there is none.
int64_t findEndOfText(const std::string& path, uint64_t from) {
    std::ifstream in(path, std::ios::binary);
    in.seekg(static_cast<std::streamoff>(from));
    std::vector<char> chunk(1 << 16);
    for (uint64_t at = from;;) {
        in.read(chunk.data(), static_cast<std::streamsize>(chunk.size()));
        const auto got = static_cast<size_t>(std::max<std::streamsize>(in.gcount(), 0));
        if (got == 0) return -1;
        if (const void* hit = std::memchr(chunk.data(), kEndOfText, got)) {
            return static_cast<int64_t>(at) + (static_cast<const char*>(hit) - chunk.data());
        }
        at += got;
    }
}

// Why the library would not open the file, in terms of its bytes.
Problem diagnoseOpenFailure(const std::string& path, uint64_t size, int32_t status) {
    if (size == 0) return {0, "the file is empty"};
    if (size < 4) return {0, "the file is " + std::to_string(size) + " bytes long, too short for the tag \"QTA_\""};
    const std::vector<unsigned char> tag = readBytes(path, 0, 4);
    if (tag.size() == 4 && std::memcmp(tag.data(), "QTA_", 4) != 0 && std::memcmp(tag.data(), "_ATQ", 4) != 0) {
        return {0, "not a record file: it does not begin with the tag \"QTA_\""};
    }
    if (size < 8) return {4, "the file header ends inside the application tag"};
    const int64_t end = findEndOfText(path, 8);
    if (end < 0) {
        return {static_cast<int64_t>(size), "the file header is truncated: its text part never ends (no byte 0x1A)"};
    }
    const uint64_t stamps = static_cast<uint64_t>(end) + 1;
    if (size - stamps < kStampBytes) {
        return {static_cast<int64_t>(stamps), "the file header is truncated: its stamps and versions need " +
                                                  std::to_string(kStampBytes) + " bytes, " +
                                                  std::to_string(size - stamps) + " remain"};
    }
    return {0, "the library cannot open the file: status " + statusText(status)};
}

int32_t readInt(const unsigned char* p, size_t size, bool swapped) {
    unsigned char b[4] = {};
    std::memcpy(b, p, size);
    if (swapped) std::reverse(b, b + size);
    if (size == 2) {
        int16_t v = 0;
        std::memcpy(&v, b, 2);
        return v;
    }
    int32_t v = 0;
    std::memcpy(&v, b, 4);
    return v;
}

// A stamp is six zeros (the clock could not be read) or a plain date and time.
bool validStamp(const int32_t s[6]) {
    if (std::all_of(s, s + 6, [](int32_t v) { return v == 0; })) return true;
    return s[0] >= 1 && s[0] <= 9999 && s[1] >= 1 && s[1] <= 12 && s[2] >= 1 && s[2] <= 31 && s[3] >= 0 && s[3] <= 23 &&
           s[4] >= 0 && s[4] <= 59 && s[5] >= 0 && s[5] <= 60;
}

// The text each known kind's writer puts after the banner; null: any.
const char* applicationText(FileKind kind) {
    switch (kind) {
    case FileKind::Grid: return "FOpenFileCreate";
    case FileKind::Xsec:
    case FileKind::Vre: return "";
    case FileKind::Unknown: break;
    }
    return nullptr;
}

// The header bytes the library skips over on open: the banner, the optional
// application text, the stamps and the reserved words.
std::optional<Problem> checkHeaderBytes(const RecordFileInfo& info) {
    const uint64_t textEnd = info.rcfBase - 1;  // the 0x1A byte
    if (textEnd < kBannerOffset + kBannerLength) {
        return Problem{static_cast<int64_t>(textEnd), "the file header ends inside the banner text"};
    }
    const std::vector<unsigned char> head = readBytes(info.path, 0, std::min<uint64_t>(textEnd, kMaxHeaderRead));
    for (uint64_t i = 0; i < kBannerLength && kBannerOffset + i < head.size(); ++i) {
        if (head[kBannerOffset + i] != static_cast<unsigned char>(kBanner[i])) {
            return Problem{
                static_cast<int64_t>(kBannerOffset + i),
                "the banner text of the file header is damaged (byte " + hexByte(head[kBannerOffset + i]) + ")"};
        }
    }
    // An application text, when there is one, follows two blanks. The
    // writers of the known kinds each write one fixed text.
    const uint64_t textStart = kBannerOffset + kBannerLength;
    if (const char* text = applicationText(info.kind)) {
        const std::string expected = *text != '\0' ? std::string("  ") + text : std::string();
        const std::string found(
            head.begin() + static_cast<std::ptrdiff_t>(textStart),
            head.begin() + static_cast<std::ptrdiff_t>(std::min<uint64_t>(head.size(), textStart + 64)));
        if (textEnd - textStart != expected.size() || found != expected) {
            const auto diff = std::mismatch(found.begin(), found.end(), expected.begin(), expected.end());
            const std::string due = expected.empty() ? "none" : "\"" + expected.substr(2) + "\"";
            return Problem{static_cast<int64_t>(textStart) + (diff.first - found.begin()),
                           "the application text of the file header is \"" +
                               printable(found.substr(std::min<size_t>(2, found.size()))) + "\"; a " +
                               kindDescription(info.kind) + " has " + due};
        }
    } else if (textEnd > textStart) {
        if (textEnd - textStart < 2 || head.size() < textStart + 2 || head[textStart] != ' ' ||
            head[textStart + 1] != ' ') {
            return Problem{static_cast<int64_t>(textStart),
                           "the file header is damaged: text after the banner does not begin with two blanks"};
        }
        for (uint64_t i = textStart + 2; i < head.size(); ++i) {
            if (head[i] < 0x20 || head[i] >= 0x7F) {
                return Problem{static_cast<int64_t>(i),
                               "the application text of the file header holds the byte " + hexByte(head[i])};
            }
        }
    }
    const std::vector<unsigned char> stamps = readBytes(info.path, info.rcfBase, kStampBytes);
    if (stamps.size() < kStampBytes) return Problem{info.rcfBase, "the file header is truncated"};
    const char* names[2] = {"creation", "edit"};
    for (int g = 0; g < 2; ++g) {
        const size_t base = static_cast<size_t>(g) * 20;
        int32_t s[6];
        for (size_t k = 0; k < 6; ++k) s[k] = readInt(&stamps[base + 2 * k], 2, info.swapped);
        if (!validStamp(s)) {
            return Problem{info.rcfBase + static_cast<int64_t>(base),
                           std::string("the ") + names[g] + " stamp of the file header is not a date and time"};
        }
    }
    for (size_t k = 40; k < kStampBytes; k += 4) {
        if (readInt(&stamps[k], 4, info.swapped) != 0) {
            return Problem{info.rcfBase + static_cast<int64_t>(k),
                           "a reserved word of the file header is not 0 as written"};
        }
    }
    return std::nullopt;
}

std::string recordHeaderName(unsigned char typeByte) {
    const auto type = static_cast<int8_t>(typeByte);
    if (type == RCF_BLOCK) return "block start";
    if (type > 0) return std::string(rcfSimpName(type)) + " record";
    return "record";
}

uint64_t headerLength(unsigned char typeByte) {
    const auto type = static_cast<int8_t>(typeByte);
    return type > 0 ? 5 : type == RCF_BLOCK ? 3 : 1;
}

struct Counts {
    uint64_t records = 0;
    uint64_t blocks = 0;
};

// The walk over every record and block mark after the file header.
std::optional<Problem> walk(FileHandle f, const RecordFileInfo& info, KindCheck* kind, Counts& counts) {
    const auto size = static_cast<int64_t>(info.size);
    bool inBlock = false;
    Mark open;
    Progress progress("checking", info.size);
    for (;;) {
        const int64_t pos = rcfTell64(f);
        if (const int32_t error = rcfPeekError(f); error != F_NO_ERROR || pos < 0) {
            return Problem{std::max<int64_t>(pos, 0), "positioning failed: status " + statusText(error)};
        }
        progress.update(static_cast<uint64_t>(pos));
        if (pos >= size) break;

        uint32_t count = 0;
        const int32_t type = rcfQuery(f, &count);
        if (type == 0) {
            const int32_t error = rcfPeekError(f);
            if (error == F_EOF) {
                const std::vector<unsigned char> b = readBytes(info.path, static_cast<uint64_t>(pos), 1);
                const unsigned char typeByte = b.empty() ? 0 : b[0];
                return Problem{pos, "the header of " + withArticle(recordHeaderName(typeByte)) + " needs " +
                                        std::to_string(headerLength(typeByte)) + " bytes, the file ends after " +
                                        std::to_string(size - pos),
                               true};
            }
            if (error != F_NO_ERROR) return Problem{pos, "reading failed: status " + statusText(error)};
            return Problem{pos, "unknown record type byte 0x00"};
        }

        const Mark m{pos, type, count};
        if (type >= RCF_FLOAT && type <= RCF_UINT2) {
            if (count == 0) return Problem{pos, recordText(type, count) + ": a record holds at least one element"};
            const uint64_t bytes = 5 + static_cast<uint64_t>(rcfSimpSize(type)) * count;
            if (bytes > static_cast<uint64_t>(size - pos)) {
                return Problem{pos,
                               withArticle(recordText(type, count)) + " needs " + std::to_string(bytes) +
                                   " bytes, only " + std::to_string(size - pos) + " remain in the file",
                               true};
            }
            ++counts.records;
        } else if (type == RCF_BLOCK) {
            if (inBlock) {
                return Problem{pos, "block " + std::to_string(count) + " starts inside block " +
                                        std::to_string(open.count) + " (offset " + std::to_string(open.offset) +
                                        "), which has no terminator; blocks do not nest"};
            }
            inBlock = true;
            open = m;
            ++counts.blocks;
        } else if (type == RCF_TERMINATOR) {
            if (!inBlock) return Problem{pos, "a block terminator without a block start"};
        } else {
            return Problem{pos, "unknown record type byte " + hexByte(static_cast<unsigned char>(type))};
        }

        if (kind != nullptr) {
            if (auto problem = kind->mark(m, inBlock)) return problem;
        }
        if (type == RCF_TERMINATOR) inBlock = false;
        rcfSkip(f);
        if (const int32_t error = rcfPeekError(f); error != F_NO_ERROR) {
            return Problem{pos, "passing over the record failed: status " + statusText(error)};
        }
    }
    if (inBlock) {
        return Problem{open.offset,
                       "block " + std::to_string(open.count) + " has no terminator: the file ends at offset " +
                           std::to_string(size),
                       true};
    }
    return std::nullopt;
}

std::unique_ptr<KindCheck> kindCheck(const RecordFileInfo& info) {
    switch (info.kind) {
    case FileKind::Grid: return gridCheck(info);
    case FileKind::Xsec: return xsecCheck(info);
    case FileKind::Vre: return vreCheck(info);
    case FileKind::Unknown: break;
    }
    return nullptr;
}

std::string damagedLine(const std::string& path, const Problem& problem) {
    return path + ": damaged at offset " + std::to_string(problem.offset) + ": " + problem.what;
}

}  // namespace

Diagnosis diagnose(const std::string& path) {
    Diagnosis d;
    int32_t status = 0;
    const RecordFileInfo info = probeRecordFile(path, &status);
    if (status != F_NO_ERROR) {
        d.damaged = true;
        d.lines.push_back(damagedLine(path, diagnoseOpenFailure(path, info.size, status)));
        return d;
    }
    if (auto problem = checkHeaderBytes(info)) {
        d.damaged = true;
        d.lines.push_back(damagedLine(path, *problem));
        return d;
    }

    RcfFilePtr file = openRecordFile(path, &status);
    if (status != F_NO_ERROR) throw Failure("cannot open " + path + " again: status " + statusText(status));

    std::unique_ptr<KindCheck> kind = kindCheck(info);
    Counts counts;
    std::optional<Problem> problem = walk(file.get(), info, kind.get(), counts);
    file.reset();
    if (!problem && kind != nullptr) problem = kind->finish();

    // A gridded file that ends inside a time step after complete ones was
    // left so by a writer that was killed: readers never reach the
    // unfinished step and the next append replaces it. The file is checked
    // again up to the last complete step.
    RecordFileInfo walked = info;
    std::string tailWarning;
    // The complete time steps of a damaged gridded file (scanned once).
    int32_t found = 0;
    int32_t inHeader = 0;
    int64_t tail = 0;
    const bool scanned = problem && info.kind == FileKind::Grid &&
                         grdFileScan(path.c_str(), &found, &inHeader, &tail) == F_NO_ERROR;
    // Only a step the header does not count yet: a header that counts it
    // describes data that are missing.
    if (scanned && problem->fileEnds && tail > 0 && found >= inHeader && static_cast<uint64_t>(tail) < info.size &&
        problem->offset >= static_cast<int64_t>(info.size) - tail) {
        walked.size -= static_cast<uint64_t>(tail);
        // Repair leaves the unfinished step where it is: it is no reason to
        // run it (a header behind its data is, and says so itself).
        tailWarning = "an unfinished time step (" + std::to_string(tail) + " bytes) follows the " +
                      std::to_string(found) +
                      " complete ones, as a writer leaves it that was killed: readers ignore it, the next "
                      "append replaces it";
        file = openRecordFile(path, &status);
        if (status != F_NO_ERROR) throw Failure("cannot open " + path + " again: status " + statusText(status));
        kind = kindCheck(walked);
        counts = Counts{};
        problem = walk(file.get(), walked, kind.get(), counts);
        file.reset();
        if (!problem && kind != nullptr) problem = kind->finish();
    }
    if (problem) {
        d.damaged = true;
        d.lines.push_back(damagedLine(path, *problem));
        // Data lost at the end of a gridded file (a copy cut short, a disk
        // that filled up): what is whole before it can still be kept. Damage
        // before the time steps stays whatever the header counts.
        if (scanned && found < inHeader && kind != nullptr && kind->beforeStepsWhole()) {
            d.repairable = true;
            d.lines.push_back("note: the header counts " + std::to_string(inHeader) + " time steps, " +
                              std::to_string(found) + " are whole: `tova repair " + path +
                              "` keeps those and makes the header count them");
        }
        return d;
    }

    if (kind == nullptr) d.lines.emplace_back("note: unknown application: only the record structure was checked");
    if (!tailWarning.empty()) d.lines.push_back("warning: " + tailWarning);
    if (kind != nullptr) {
        for (const std::string& warning : kind->warnings()) d.lines.push_back("warning: " + warning);
        for (const std::string& note : kind->notes()) d.lines.push_back("note: " + note);
        d.repairable = kind->repairable();
    }
    d.lines.push_back("OK: " + std::to_string(counts.records) + " records in " + std::to_string(counts.blocks) +
                      " blocks, " + std::to_string(walked.size) + " bytes");
    return d;
}

int runCheck(const CheckOptions& options) {
    std::error_code ec;
    if (std::filesystem::exists(options.file, ec) && !std::filesystem::is_directory(options.file, ec) &&
        !std::filesystem::is_regular_file(options.file, ec)) {
        throw Failure(options.file + " is not a regular file");
    }
    int32_t status = 0;
    probeRecordFile(options.file, &status);
    // A file that cannot be opened at all is no damaged file: say why.
    if (status == F_ERR_OPEN || std::filesystem::is_directory(options.file, ec)) probeRecordFile(options.file);
    const Diagnosis d = diagnose(options.file);
    std::string report;
    for (const std::string& line : d.lines) report += line + "\n";
    printOut(report);
    return d.damaged ? kExitFailed : kExitOk;
}

int reportDamage(const std::string& path, const std::string& failure) {
    Diagnosis d;
    try {
        d = diagnose(path);
    } catch (const Failure&) {  // cannot be opened at all: the failure says it
    }
    std::string text;
    if (d.damaged) {
        for (const std::string& line : d.lines) text += (text.empty() ? "tova: " : "") + line + "\n";
    } else {
        // Not damaged as `check` sees it: the failure stands, with any warning.
        text = "tova: " + failure + "\n";
        for (const std::string& line : d.lines) {
            if (line.rfind("warning: ", 0) == 0) text += line + "\n";
        }
    }
    std::fputs(text.c_str(), stderr);
    return kExitFailed;
}

}  // namespace tova_cli
