// The cross-section rules of `tova check`. A cross-section file is a sequence
// of blocks: per cross section a key block (257), a header block (258) and up
// to four data blocks (259 raw points, 260 selection, 261 processed rows, 262
// coordinates). This check verifies what each block holds as it is walked and
// then loads the file through the cross-section API, which must accept it and
// yield every cross section.
#include <array>
#include <initializer_list>
#include <memory>
#include <string>

#include "check.h"
#include "tova/rcf.h"
#include "xsec_table.h"

namespace tova_cli {

namespace {

enum : uint32_t {
    kKeyBlock = 257,
    kHeaderBlock = 258,
    kRawBlock = 259,
    kSelectionBlock = 260,
    kProcessedBlock = 261,
    kCoordinateBlock = 262
};

constexpr size_t kMaxRecords = 6;  // no block of this format holds more

const char* blockName(uint32_t id) {
    switch (id) {
    case kKeyBlock: return "key block";
    case kHeaderBlock: return "header block";
    case kRawBlock: return "raw-point block";
    case kSelectionBlock: return "selection block";
    case kProcessedBlock: return "processed-row block";
    case kCoordinateBlock: return "coordinate block";
    default: return "block";
    }
}

// Header words and values the loader copies, by format version.
struct HeaderShape {
    uint32_t words;
    uint32_t values;
};

HeaderShape headerShape(uint32_t version, bool fourRecordKey) {
    if (version >= 105) return {25, 23};
    if (version == 104) return {24, 15};
    const uint32_t values = fourRecordKey ? 10 : 9;
    if (version == 103) return {23, values};
    if (version == 102) return {21, values};
    return {fourRecordKey ? 20u : 16u, values};
}

class XsecCheck final : public KindCheck {
public:
    explicit XsecCheck(const RecordFileInfo& info) : info_(info) {}

    std::optional<Problem> mark(const Mark& m, bool inBlock) override {
        if (m.type == RCF_BLOCK) return blockStart(m);
        if (m.type == RCF_TERMINATOR) return blockEnd();
        if (!inBlock) return Problem{m.offset, withArticle(recordText(m.type, m.count)) + " outside any block"};
        if (records_ == kMaxRecords) {
            return Problem{m.offset, std::string("the ") + blockName(block_.count) + " holds more than " +
                                         std::to_string(kMaxRecords) + " records"};
        }
        record_[records_++] = m;
        return std::nullopt;
    }

    std::optional<Problem> finish() override {
        if (keyPending_) return Problem{key_.offset, "the last key block has no header block"};
        // The loader must accept the file and make every cross section valid.
        int32_t status = 0;
        const XsecTablePtr table = loadXsecTable(info_.path, &status);
        if (status != F_NO_ERROR || !table) {
            return Problem{info_.appBase, "the cross-section loader refuses the file: status " + statusText(status)};
        }
        const size_t valid = walkXsecTable(table.get()).size();
        if (valid != sections_) {
            return Problem{info_.appBase, "the cross-section loader makes " + std::to_string(valid) + " of the " +
                                              std::to_string(sections_) + " cross sections valid"};
        }
        return std::nullopt;
    }

private:
    std::optional<Problem> blockStart(const Mark& m) {
        block_ = m;
        records_ = 0;
        if (m.count < kKeyBlock || m.count > kCoordinateBlock) {
            return Problem{m.offset,
                           "block " + std::to_string(m.count) + " is no block of cross-section files (257 to 262)"};
        }
        if (m.count == kKeyBlock && keyPending_) {
            return Problem{key_.offset, "a key block without a header block"};
        }
        if (m.count == kHeaderBlock && !keyPending_) {
            return Problem{m.offset, "a header block without a key block before it"};
        }
        if (m.count > kHeaderBlock && (keyPending_ || sections_ == 0)) {
            return Problem{m.offset, withArticle(blockName(m.count)) + " outside any cross section"};
        }
        return std::nullopt;
    }

    // Problem at record i of the block just ended.
    Problem at(size_t i, const std::string& what) const {
        return Problem{record_[i].offset, std::string(blockName(block_.count)) + ": " + what};
    }

    std::optional<Problem> expectType(size_t i, int32_t type) const {
        if (record_[i].type == type) return std::nullopt;
        return at(i, std::string("record ") + std::to_string(i + 1) + " should be " + rcfSimpName(type) + ", it is " +
                         withArticle(recordText(record_[i].type, record_[i].count)));
    }

    std::optional<Problem> wrongCount(const std::string& due) const {
        return Problem{block_.offset, std::string("the ") + blockName(block_.count) + " holds " +
                                          std::to_string(records_) + (records_ == 1 ? " record, " : " records, ") +
                                          due};
    }

    // A data set: columns of equal length, of the given types.
    std::optional<Problem> dataSet(std::initializer_list<int32_t> types) {
        size_t i = 0;
        for (int32_t type : types) {
            if (auto p = expectType(i, type)) return p;
            if (record_[i].count != record_[0].count) {
                return at(i, "its columns differ in length (" + std::to_string(record_[i].count) + " and " +
                                 std::to_string(record_[0].count) + ")");
            }
            ++i;
        }
        return std::nullopt;
    }

    std::optional<Problem> blockEnd() {
        switch (block_.count) {
        case kKeyBlock: {
            // Names are byte records; the key value is one double.
            if (records_ < 3 || records_ > 4) return wrongCount("3 or 4 are due (names and key value)");
            for (size_t i = 0; i < records_; ++i) {
                if (auto p = expectType(i, i == 1 ? RCF_DOUBLE : RCF_BYTE)) return p;
            }
            if (record_[1].count != 1)
                return at(1, "the key value is one double, not " + std::to_string(record_[1].count));
            keyPending_ = true;
            key_ = block_;
            fourRecordKey_ = records_ == 4;
            break;
        }
        case kHeaderBlock: {
            if (records_ != 2) return wrongCount("2 are due (header words and values)");
            if (auto p = expectType(0, RCF_UINT2)) return p;
            if (auto p = expectType(1, RCF_DOUBLE)) return p;
            const HeaderShape shape = headerShape(info_.versionCreateApp, fourRecordKey_);
            if (record_[0].count < shape.words) {
                return at(0, std::to_string(record_[0].count) + " header words, format version " +
                                 std::to_string(info_.versionCreateApp) + " has " + std::to_string(shape.words));
            }
            if (record_[1].count < shape.values) {
                return at(1, std::to_string(record_[1].count) + " header values, format version " +
                                 std::to_string(info_.versionCreateApp) + " has " + std::to_string(shape.values));
            }
            keyPending_ = false;
            ++sections_;
            break;
        }
        case kRawBlock:
            if (records_ == 3) return dataSet({RCF_DOUBLE, RCF_DOUBLE, RCF_DOUBLE});
            if (records_ != 6) return wrongCount("6 are due (or 3 in old files)");
            return dataSet({RCF_DOUBLE, RCF_DOUBLE, RCF_DOUBLE, RCF_DOUBLE, RCF_UINT2, RCF_UINT2});
        case kSelectionBlock:
            if (records_ != 1) return wrongCount("1 is due");
            return dataSet({RCF_DOUBLE});
        case kProcessedBlock:
            if (records_ != 6) return wrongCount("6 are due");
            return dataSet({RCF_DOUBLE, RCF_DOUBLE, RCF_DOUBLE, RCF_DOUBLE, RCF_DOUBLE, RCF_DOUBLE});
        case kCoordinateBlock:
            if (records_ != 3) return wrongCount("3 are due");
            return dataSet({RCF_DOUBLE, RCF_DOUBLE, RCF_DOUBLE});
        default: break;
        }
        return std::nullopt;
    }

    RecordFileInfo info_;
    Mark block_;                              // the block being walked
    std::array<Mark, kMaxRecords> record_{};  // its records so far
    size_t records_ = 0;
    Mark key_;                 // the last key block
    bool keyPending_ = false;  // a key block waits for its header block
    bool fourRecordKey_ = false;
    uint64_t sections_ = 0;  // header blocks seen
};

}  // namespace

std::unique_ptr<KindCheck> xsecCheck(const RecordFileInfo& info) { return std::make_unique<XsecCheck>(info); }

}  // namespace tova_cli
