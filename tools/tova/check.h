// Structural check of record files. The walk in check.cpp goes through the
// file header and every record and block mark with the public record-file
// API; a KindCheck adds the rules of one kind of file (what its blocks hold,
// the sequence of its records) and loads the file through its own API.
#pragma once

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

#include "tova_cli.h"

namespace tova_cli {

// The first problem found: where it is and a one-line explanation.
struct Problem {
    int64_t offset = 0;
    std::string what;
    bool fileEnds = false;  // the file ends inside a record, block or time step
};

// One record, block start or terminator met by the walk.
struct Mark {
    int64_t offset = 0;
    int32_t type = 0;    // simple type 1-7, RCF_BLOCK or RCF_TERMINATOR
    uint32_t count = 0;  // elements of a data record; identifier of a block start
};

class KindCheck {
public:
    virtual ~KindCheck() = default;
    // Called for every mark in file order, after the walk has found it sound;
    // inBlock tells whether a block is open (for a terminator: the one it ends).
    virtual std::optional<Problem> mark(const Mark& m, bool inBlock) {
        (void)m;
        (void)inBlock;
        return std::nullopt;
    }
    // Called once the whole file has walked clean.
    virtual std::optional<Problem> finish() = 0;
    // Remarks for the report that are not problems.
    const std::vector<std::string>& notes() const { return notes_; }
    // Findings that are no damage but need the user's attention.
    const std::vector<std::string>& warnings() const { return warnings_; }
    // Whether `tova repair` would bring the file up to date.
    bool repairable() const { return repairable_; }
    // Whether everything before the time steps was whole where the walk
    // stopped: damage after that point loses time steps only.
    virtual bool beforeStepsWhole() const { return false; }

protected:
    bool repairable_ = false;
    std::vector<std::string> notes_;
    std::vector<std::string> warnings_;
};

// What `check` says of a file: "FILE: damaged at offset N: ..." and the notes
// on it, or the warnings, notes and the "OK: ..." line of a sound file.
struct Diagnosis {
    bool damaged = false;
    bool repairable = false;  // `tova repair` would change the file's header
    std::vector<std::string> lines;
};
// The full check of a record file (walks every record, with progress on a
// terminal). Failure only when the file cannot be opened at all.
Diagnosis diagnose(const std::string& path);

std::unique_ptr<KindCheck> vreCheck(const RecordFileInfo& file);
std::unique_ptr<KindCheck> xsecCheck(const RecordFileInfo& file);

// "double record of 3 elements" and the like.
std::string recordText(int32_t type, uint32_t count);

// The noun phrase with "a" or "an" before it.
std::string withArticle(const std::string& phrase);

}  // namespace tova_cli
