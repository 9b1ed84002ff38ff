// The gridded-data rules of `tova check`. A gridded data file is a header
// stream of tagged blocks (header fields 10000-10013, the time section 20000
// with one time-axis block, the item section 30000/30001 with per item its
// record 30005 or 30002, an optional value type 30006, its axis block 31xxx
// and optional statistics 30003 and associations 30004, then custom blocks
// 60000), an optional static section (40000, then per static item its item
// record, axis block and a 40001 block with its values) and the dynamic
// section (50000, then per time step a 50001 block followed by one record per
// item). This check follows that grammar as the walk goes, reading the few
// numbers it needs (item count, data types, axis sizes, time-step count)
// from the records themselves, so that it does not depend on the library's
// reader; then it loads the file through the gridded data-file API.
#include <algorithm>
#include <array>
#include <cstring>
#include <fstream>
#include <memory>
#include <string>
#include <vector>

#include "check.h"
#include "grd_access.h"
#include "grd_commands.h"
#include "tova/rcf.h"

namespace tova_cli {

namespace {

constexpr uint32_t kHeaderStart = 10000;
constexpr uint32_t kFileTitle = 10001;
constexpr uint32_t kAppTitle = 10002;
constexpr uint32_t kAppVersion = 10003;
constexpr uint32_t kFileType = 10004;
constexpr uint32_t kStatsType = 10005;
constexpr uint32_t kDeleteFloat = 10006;
constexpr uint32_t kDeleteDouble = 10007;
constexpr uint32_t kDeleteByte = 10008;
constexpr uint32_t kDeleteInt = 10009;
constexpr uint32_t kDeleteUnsigned = 10010;
constexpr uint32_t kProjection = 10011;
constexpr uint32_t kDataType = 10012;
constexpr uint32_t kCompressed = 10013;
constexpr uint32_t kTimeStart = 20000;
constexpr uint32_t kTimeOlder = 20000;  // 20001-20004: time axis with its unit as a text
constexpr uint32_t kTime = 20050;       // 20051-20054
constexpr uint32_t kItemStart = 30000;
constexpr uint32_t kItemCount = 30001;
constexpr uint32_t kItemText = 30002;
constexpr uint32_t kElemStats = 30003;
constexpr uint32_t kAssocStatic = 30004;
constexpr uint32_t kItem = 30005;
constexpr uint32_t kValueType = 30006;
constexpr uint32_t kAxisOlder = 31000;  // 31001-31010: without the axis unit
constexpr uint32_t kAxis = 31050;       // 31051-31060
constexpr uint32_t kCurveLinearD2 = 31061;
constexpr uint32_t kCurveLinearD3 = 31062;
constexpr uint32_t kStaticStart = 40000;
constexpr uint32_t kStaticData = 40001;
constexpr uint32_t kDynamicStart = 50000;
constexpr uint32_t kTimeStep = 50001;
constexpr uint32_t kCustomBlock = 60000;

constexpr size_t kMaxRecords = 8;  // no block of this format holds more

constexpr int8_t kAxisDims[] = {0, 0, 1, 1, 1, 2, 2, 2, 3, 3, 3, 4, 2, 3};

// The axis type of an axis tag, 0 for another tag.
int32_t axisTypeOf(uint32_t tag, bool* older) {
    *older = tag > kAxisOlder && tag <= kAxisOlder + F_TVAR_AXIS_D3;
    if (*older) return static_cast<int32_t>(tag - kAxisOlder);
    if (tag > kAxis && tag <= kAxis + F_TVAR_AXIS_D3) return static_cast<int32_t>(tag - kAxis);
    if (tag == kCurveLinearD2) return F_CURVE_LINEAR_AXIS_D2;
    if (tag == kCurveLinearD3) return F_CURVE_LINEAR_AXIS_D3;
    return 0;
}

bool isTimeTag(uint32_t tag) {
    return (tag > kTimeOlder && tag <= kTimeOlder + F_CAL_NEQ_AXIS) ||
           (tag > kTime && tag <= kTime + F_CAL_NEQ_AXIS);
}

// One due record: a type and a count (0: any count).
struct Due {
    int32_t type;
    uint64_t count;
};

// What the walk has learnt of an item (or static item) from its records.
struct Shape {
    int64_t offset = 0;  // of its item record
    int32_t dataType = 0;
    int32_t axisType = 0;
    int64_t elements = -1;  // -1 until its axis block was read
};

enum class Section { Start, Header, Time, Items, Static, Dynamic };

class GridCheck final : public KindCheck {
public:
    explicit GridCheck(const RecordFileInfo& info)
        : info_(info), in_(info.path, std::ios::binary) {}

    std::optional<Problem> mark(const Mark& m, bool inBlock) override {
        if (m.type == RCF_BLOCK) {
            block_ = m;
            records_ = 0;
            if (section_ == Section::Start && m.count != kHeaderStart) {
                return Problem{m.offset, "the header stream begins with block " + std::to_string(m.count) +
                                             ", not with the header start 10000"};
            }
            return blockStart(m);
        }
        if (m.type == RCF_TERMINATOR) return blockEnd();
        if (inBlock) {
            if (records_ == kMaxRecords) {
                return Problem{m.offset, "block " + std::to_string(block_.count) + " holds more than " +
                                             std::to_string(kMaxRecords) + " records"};
            }
            record_[records_++] = m;
            return std::nullopt;
        }
        return dataRecord(m);
    }

    std::optional<Problem> finish() override {
        const auto end = static_cast<int64_t>(info_.size);
        if (section_ == Section::Start) return Problem{end, "the file holds no header stream"};
        if (section_ == Section::Header || section_ == Section::Time || section_ == Section::Items) {
            if (auto p = itemsComplete(end)) return p;
            return Problem{end, "the header stream is not followed by a static section (block 40000) or a "
                                "dynamic section (block 50000): the file ends after it"};
        }
        if (section_ == Section::Static && pendingStatic_) {
            return Problem{end, "the file ends before the values (block 40001) of static item " +
                                    std::to_string(statics_.size())};
        }
        if (section_ == Section::Dynamic) {
            if (stepOpen_) {
                return Problem{end,
                               "time step " + std::to_string(stepsSeen_ - 1) + " ends after " + std::to_string(next_) +
                                   " of its " + std::to_string(items_.size()) + " item records: the file is cut short",
                               true};
            }
            if (stepsSeen_ < headerSteps_) {
                return Problem{end, "the header says " + std::to_string(headerSteps_) + " time steps, the data ends after " +
                                        std::to_string(stepsSeen_) + ": the file is cut short"};
            }
        } else if (headerSteps_ > 0) {
            return Problem{end, "the header says " + std::to_string(headerSteps_) +
                                    " time steps, the file ends before its dynamic section (block 50000)"};
        }
        if (stepsSeen_ > headerSteps_) {
            repairable_ = true;
            warnings_.push_back("the header says " + std::to_string(headerSteps_) + " time steps, the data holds " +
                             std::to_string(stepsSeen_) +
                             " complete ones: the header was not brought up to date after the last steps were "
                             "written (readers see only " +
                             std::to_string(headerSteps_) + "; repairable: run `tova repair " + info_.path + "`)");
        }
        if (section_ == Section::Dynamic && !strictSteps_) {
            notes_.push_back("file type " + std::to_string(fileType_) +
                             ": the records of each time step were checked for their number only");
        }
        return loadThroughApi();
    }

    bool beforeStepsWhole() const override {
        return section_ == Section::Dynamic || (section_ == Section::Static && !pendingStatic_);
    }

private:
    // ---- Reading the few numbers the grammar needs ----------------------

    std::vector<int32_t> readInts(const Mark& record, size_t n) {
        std::vector<int32_t> values(n, 0);
        const size_t size = record.type == RCF_INT2 ? 2 : 4;
        in_.clear();
        in_.seekg(static_cast<std::streamoff>(record.offset + 5));
        for (size_t i = 0; i < n && in_; ++i) {
            unsigned char b[4] = {};
            in_.read(reinterpret_cast<char*>(b), static_cast<std::streamsize>(size));
            if (info_.swapped) std::reverse(b, b + size);
            if (size == 2) {
                int16_t v = 0;
                std::memcpy(&v, b, 2);
                values[i] = v;
            } else {
                std::memcpy(&values[i], b, 4);
            }
        }
        return values;
    }

    int32_t readInt(const Mark& record) { return readInts(record, 1)[0]; }

    // ---- Blocks ---------------------------------------------------------

    Problem at(const Mark& m, const std::string& what) const { return Problem{m.offset, what}; }

    Problem misplaced(const std::string& what) const {
        return at(block_, "block " + std::to_string(block_.count) + " (" + what + ") " + where());
    }

    std::string where() const {
        switch (section_) {
        case Section::Start: return "before the header start";
        case Section::Header: return "among the header fields";
        case Section::Time: return "in the time section";
        case Section::Items: return "in the item section";
        case Section::Static: return "in the static section";
        case Section::Dynamic: return "in the dynamic section";
        }
        return "";
    }

    std::optional<Problem> blockStart(const Mark& m) {
        const uint32_t tag = m.count;
        bool older = false;
        if (tag == kHeaderStart) {
            if (section_ != Section::Start) return misplaced("header start");
            section_ = Section::Header;
        } else if (tag > kHeaderStart && tag <= kCompressed) {
            if (section_ != Section::Header) return misplaced("a header field");
            if (std::find(fields_.begin(), fields_.end(), tag) != fields_.end()) {
                return at(m, "header field block " + std::to_string(tag) + " occurs twice");
            }
            fields_.push_back(tag);
        } else if (tag == kTimeStart) {
            if (section_ != Section::Header) return misplaced("time section start");
            if (std::find(fields_.begin(), fields_.end(), kFileType) == fields_.end()) {
                return at(m, "the header fields hold no file type (block 10004)");
            }
            section_ = Section::Time;
        } else if (isTimeTag(tag)) {
            if (section_ != Section::Time) return misplaced("a time axis");
            if (timeBlock_ != 0) return at(m, "a second time-axis block; the first is " + std::to_string(timeBlock_));
        } else if (tag == kItemStart) {
            if (section_ != Section::Time) return misplaced("item section start");
            if (timeBlock_ == 0) return at(m, "the time section holds no time axis (blocks 20051-20054)");
            section_ = Section::Items;
        } else if (tag == kItemCount) {
            if (section_ != Section::Items || itemCount_ >= 0) return misplaced("item count");
        } else if (tag == kItem || tag == kItemText) {
            return itemRecordStart(m);
        } else if (tag == kValueType) {
            if (!itemStep(Step::Record, Step::ValueType)) return misplaced("value type");
        } else if (axisTypeOf(tag, &older) != 0) {
            if (!itemStep(Step::ValueType, Step::Axis)) return misplaced("an item axis");
        } else if (tag == kElemStats) {
            if (section_ != Section::Items || !itemStep(Step::Axis, Step::Stats)) return misplaced("element statistics");
        } else if (tag == kAssocStatic) {
            if (section_ != Section::Items || !itemStep(Step::Stats, Step::Assoc)) return misplaced("static associations");
        } else if (tag == kCustomBlock) {
            if (section_ != Section::Items) return misplaced("a custom block");
            if (auto p = itemsComplete(m.offset)) return p;
            customSeen_ = true;
        } else if (tag == kStaticStart) {
            if (section_ != Section::Items) return misplaced("static section start");
            if (auto p = itemsComplete(m.offset)) return p;
            section_ = Section::Static;
        } else if (tag == kStaticData) {
            if (section_ != Section::Static || !pendingStatic_ || step_ != Step::Axis) return misplaced("static values");
        } else if (tag == kDynamicStart) {
            if (section_ == Section::Items) {
                if (auto p = itemsComplete(m.offset)) return p;
            } else if (section_ != Section::Static || pendingStatic_) {
                return misplaced("dynamic section start");
            }
            section_ = Section::Dynamic;
            strictSteps_ = fileType_ == F_EQTIME_FIXEDSPACE_ALLITEMS || fileType_ == F_NEQTIME_FIXEDSPACE_ALLITEMS;
        } else if (tag == kTimeStep) {
            if (section_ != Section::Dynamic) return misplaced("a time step");
            if (stepOpen_) {
                return at(m, "time step " + std::to_string(stepsSeen_) + " begins after only " + std::to_string(next_) +
                                 " of the " + std::to_string(items_.size()) + " item records of time step " +
                                 std::to_string(stepsSeen_ - 1));
            }
            stepOffsets_.push_back(m.offset);
            ++stepsSeen_;
            // Whole once its last item record follows (a 50001 block alone is no step).
            stepOpen_ = strictSteps_ && !items_.empty();
        } else {
            return at(m, "block " + std::to_string(tag) + " is no block of gridded data files");
        }
        return std::nullopt;
    }

    // Steps of an item group: its record, an optional value type, its axis,
    // optional statistics and associations.
    enum class Step { None, Record, ValueType, Axis, Stats, Assoc };

    // Moves the item group to `to` when it stands at `after` or at the step
    // before `after` that may be left out.
    bool itemStep(Step after, Step to) {
        const bool ok = step_ == after || (after == Step::ValueType && step_ == Step::Record) ||
                        (after == Step::Stats && step_ == Step::Axis);
        if (ok) step_ = to;
        return ok;
    }

    std::optional<Problem> itemRecordStart(const Mark& m) {
        if (section_ == Section::Items) {
            if (itemCount_ < 0) return at(m, "an item record before the item count (block 30001)");
            if (customSeen_) return at(m, "an item record after the custom blocks");
            if (step_ != Step::None && step_ < Step::Axis) {
                return at(m, "item " + std::to_string(items_.size()) + " has no axis block before the next item");
            }
            if (static_cast<int64_t>(items_.size()) == itemCount_) {
                return at(m, "the item count says " + std::to_string(itemCount_) + " items; a further item record follows");
            }
            items_.push_back(Shape{m.offset});
        } else if (section_ == Section::Static) {
            if (pendingStatic_) {
                return at(m, "static item " + std::to_string(statics_.size()) + " has no values (block 40001)");
            }
            statics_.push_back(Shape{m.offset});
            pendingStatic_ = true;
        } else {
            return misplaced("an item record");
        }
        step_ = Step::Record;
        return std::nullopt;
    }

    Shape& current() { return section_ == Section::Static ? statics_.back() : items_.back(); }

    // The item section must hold every item it announced, each with its axis.
    std::optional<Problem> itemsComplete(int64_t offset) {
        if (section_ != Section::Items) return std::nullopt;
        if (itemCount_ < 0) return Problem{offset, "the item section holds no item count (block 30001)"};
        if (step_ != Step::None && step_ < Step::Axis) {
            return Problem{offset, "item " + std::to_string(items_.size()) + " has no axis block"};
        }
        if (static_cast<int64_t>(items_.size()) != itemCount_) {
            return Problem{offset, "the item count says " + std::to_string(itemCount_) + " items, " +
                                       std::to_string(items_.size()) + " item records follow"};
        }
        step_ = Step::None;
        return std::nullopt;
    }

    // ---- Block contents --------------------------------------------------

    std::optional<Problem> expect(std::initializer_list<Due> due) {
        if (records_ != due.size()) {
            return at(block_, "block " + std::to_string(block_.count) + " holds " + std::to_string(records_) +
                                  (records_ == 1 ? " record, " : " records, ") + std::to_string(due.size()) +
                                  (due.size() == 1 ? " is" : " are") + " due");
        }
        size_t i = 0;
        for (const Due& d : due) {
            const Mark& r = record_[i];
            if (r.type != d.type || (d.count != 0 && r.count != d.count)) {
                const std::string wanted =
                    d.count != 0 ? recordText(d.type, static_cast<uint32_t>(d.count)) : std::string(rcfSimpName(d.type)) + " record";
                return at(r, "block " + std::to_string(block_.count) + ", record " + std::to_string(i + 1) +
                                 ": expected " + withArticle(wanted) + ", found " + withArticle(recordText(r.type, r.count)));
            }
            ++i;
        }
        return std::nullopt;
    }

    std::optional<Problem> blockEnd() {
        const uint32_t tag = block_.count;
        constexpr int32_t B = RCF_BYTE, I = RCF_INT4, D = RCF_DOUBLE, F = RCF_FLOAT;
        bool older = false;
        switch (tag) {
        case kHeaderStart:
        case kTimeStart:
        case kItemStart:
        case kStaticStart:
        case kDynamicStart: return expect({});
        case kFileTitle:
        case kAppTitle: return expect({{B, 0}});
        case kAppVersion:
        case kDeleteInt:
        case kDataType:
        case kStatsType: return expect({{I, 1}});
        case kCompressed:
            if (auto p = expect({{I, 1}})) return p;
            compressed_ = readInt(record_[0]) != 0;
            return std::nullopt;
        case kFileType:
            if (auto p = expect({{RCF_INT2, 1}})) return p;
            fileType_ = readInt(record_[0]);
            return std::nullopt;
        case kDeleteFloat: return expect({{F, 1}});
        case kDeleteDouble: return expect({{D, 1}});
        case kDeleteByte: return expect({{B, 1}});
        case kDeleteUnsigned: return expect({{RCF_UINT4, 1}});
        case kProjection: return expect({{B, 0}, {D, 3}});
        case kItemCount:
            if (auto p = expect({{I, 1}})) return p;
            itemCount_ = readInt(record_[0]);
            if (itemCount_ < 0) return at(record_[0], "the item count is negative (" + std::to_string(itemCount_) + ")");
            return std::nullopt;
        case kItem:
        case kItemText: {
            if (auto p = tag == kItem ? expect({{I, 1}, {B, 0}, {I, 1}, {I, 1}, {D, 3}, {F, 3}, {F, 3}})
                                      : expect({{I, 1}, {B, 0}, {B, 0}, {I, 1}, {D, 3}, {F, 3}, {F, 3}}))
                return p;
            current().dataType = readInt(record_[3]);
            if (elementSizeOf(current().dataType) == 0) {
                return at(record_[3], "the data type of the item is " + std::to_string(current().dataType) +
                                          ", no simple type (1-7)");
            }
            return std::nullopt;
        }
        case kValueType: return expect({{I, 1}});
        case kElemStats: {
            const Shape& item = items_.back();
            if (auto p = expect({{D, 0}})) return p;
            if (record_[0].count % 9 != 0 || record_[0].count > 9 * static_cast<uint64_t>(std::max<int64_t>(item.elements, 0))) {
                return at(record_[0], "the element statistics of item " + std::to_string(items_.size()) + " hold " +
                                          std::to_string(record_[0].count) + " values; nine per element are due, at most " +
                                          std::to_string(9 * item.elements));
            }
            return std::nullopt;
        }
        case kAssocStatic: return expect({{RCF_UINT4, 0}});
        case kCustomBlock:
            if (records_ == 1) return expect({{B, 0}});
            if (records_ == 2) return expect({{B, 0}, {record_[1].type, 0}});
            return expect({{B, 0}, {B, 0}});
        case kStaticData: {
            Shape& item = statics_.back();
            if (auto p = expect({{item.dataType, static_cast<uint64_t>(item.elements)}})) return p;
            pendingStatic_ = false;
            step_ = Step::None;
            // The first static item of a compressed file is the X key: its
            // length caps every dynamic item.
            if (statics_.size() == 1 && compressed_ && item.axisType == F_EQ_AXIS_D1 &&
                (item.dataType == RCF_INT4 || item.dataType == RCF_UINT4)) {
                keyLength_ = item.elements;
            }
            return std::nullopt;
        }
        case kTimeStep:
            if (fileType_ == F_EQTIME_FIXEDSPACE_ALLITEMS || fileType_ == F_EQTIME_TVARSPACE_ALLITEMS) return expect({});
            return expect({{D, 1}});
        default: break;
        }
        if (isTimeTag(tag)) return timeBlockEnd(tag);
        if (const int32_t axisType = axisTypeOf(tag, &older)) return axisBlockEnd(axisType, older);
        return std::nullopt;
    }

    std::optional<Problem> timeBlockEnd(uint32_t tag) {
        constexpr int32_t B = RCF_BYTE, I = RCF_INT4, D = RCF_DOUBLE;
        const bool calendar = (tag - (tag > kTime ? kTime : kTimeOlder)) >= F_CAL_EQ_AXIS;
        const bool textUnit = tag < kTime;
        std::optional<Problem> p;
        if (calendar) {
            p = textUnit ? expect({{B, 0}, {B, 0}, {B, 0}, {D, 2}, {I, 2}}) : expect({{B, 0}, {B, 0}, {I, 1}, {D, 2}, {I, 2}});
        } else {
            p = textUnit ? expect({{B, 0}, {D, 2}, {I, 2}}) : expect({{I, 1}, {D, 2}, {I, 2}});
        }
        if (p) return p;
        timeBlock_ = tag;
        headerSteps_ = readInt(record_[records_ - 1]);
        if (headerSteps_ < 0) {
            return at(record_[records_ - 1], "the number of time steps is negative (" + std::to_string(headerSteps_) + ")");
        }
        return std::nullopt;
    }

    std::optional<Problem> axisBlockEnd(int32_t axisType, bool older) {
        const int32_t dirs = kAxisDims[axisType];
        const uint64_t ints = static_cast<uint64_t>(dirs) + (older ? 0 : 1);
        if (ints == 0) {
            if (auto p = expect({})) return p;
        } else if (records_ == 0 || record_[0].type != RCF_INT4 || record_[0].count != ints) {
            if (records_ == 0) return expect({{RCF_INT4, ints}});
            return at(record_[0], "axis block " + std::to_string(block_.count) + ": expected " +
                                      withArticle(recordText(RCF_INT4, static_cast<uint32_t>(ints))) + ", found " +
                                      withArticle(recordText(record_[0].type, record_[0].count)));
        }
        int64_t size[4] = {1, 1, 1, 1};
        if (ints > 0) {
            const std::vector<int32_t> values = readInts(record_[0], static_cast<size_t>(ints));
            for (int32_t d = 0; d < dirs; ++d) {
                size[d] = values[static_cast<size_t>(d + (older ? 0 : 1))];
                if (size[d] < 0) {
                    return at(record_[0], "axis size " + std::to_string(d + 1) + " is negative (" + std::to_string(size[d]) + ")");
                }
            }
        }
        int64_t elements = 1;
        for (int32_t d = 0; d < dirs; ++d) elements = std::min<int64_t>(elements * size[d], int64_t{1} << 40);
        const auto nodes = [&](int32_t n) {
            int64_t product = 1;
            for (int32_t d = 0; d < n; ++d) product = std::min<int64_t>(product * (size[d] + 1), int64_t{1} << 40);
            return static_cast<uint64_t>(product);
        };
        const auto bound = [&](int32_t d) { return static_cast<uint64_t>(size[d] + 1); };
        constexpr int32_t I = RCF_INT4, F = RCF_FLOAT, D = RCF_DOUBLE;
        std::optional<Problem> p;
        switch (axisType) {
        case F_EQ_AXIS_D1:
        case F_EQ_AXIS_D2:
        case F_EQ_AXIS_D3: p = expect({{I, ints}, {F, 2 * static_cast<uint64_t>(dirs)}}); break;
        case F_NEQ_AXIS_D1:
            p = size[0] > 0 ? expect({{I, ints}, {F, 3 * static_cast<uint64_t>(size[0])}}) : expect({{I, ints}});
            break;
        case F_NEQ_AXIS_D2: p = expect({{I, ints}, {D, bound(0)}, {D, bound(1)}}); break;
        case F_NEQ_AXIS_D3: p = expect({{I, ints}, {D, bound(0)}, {D, bound(1)}, {D, bound(2)}}); break;
        case F_CURVE_LINEAR_AXIS_D2: p = expect({{I, ints}, {D, nodes(2)}, {D, nodes(2)}}); break;
        case F_CURVE_LINEAR_AXIS_D3: p = expect({{I, ints}, {D, nodes(3)}, {D, nodes(3)}, {D, nodes(3)}}); break;
        case F_EQ_AXIS_D0:
            if (ints > 0) p = expect({{I, ints}});
            break;
        default: p = expect({{I, ints}}); break;  // time-varying axes: the sizes only
        }
        if (p) return p;
        Shape& item = current();
        item.axisType = axisType;
        item.elements = elements;
        if (section_ == Section::Static && (axisType == F_TVAR_AXIS_D1 || axisType == F_TVAR_AXIS_D2 || axisType == F_TVAR_AXIS_D3)) {
            return at(block_, "static item " + std::to_string(statics_.size()) + " has a time-varying axis");
        }
        return std::nullopt;
    }

    static size_t elementSizeOf(int32_t type) { return type >= RCF_FLOAT && type <= RCF_UINT2 ? rcfSimpSize(type) : 0; }

    // ---- Dynamic records ----------------------------------------------------

    std::optional<Problem> dataRecord(const Mark& m) {
        if (section_ != Section::Dynamic || stepsSeen_ == 0) {
            return at(m, withArticle(recordText(m.type, m.count)) + " outside any block " + where());
        }
        // Time steps of the other file types hold records of their own kind.
        if (!strictSteps_) return std::nullopt;
        if (items_.empty() || next_ == items_.size()) {
            return at(m, "time step " + std::to_string(stepsSeen_ - 1) + " holds more records than its " +
                             std::to_string(items_.size()) + " items");
        }
        const Shape& item = items_[next_];
        const int64_t used = compressed_ ? std::min(item.elements, keyLength_) : item.elements;
        if (m.type != item.dataType || static_cast<int64_t>(m.count) != used) {
            return at(m, "time step " + std::to_string(stepsSeen_ - 1) + ", item " + std::to_string(next_ + 1) +
                             ": expected " + withArticle(recordText(item.dataType, static_cast<uint32_t>(used))) +
                             ", found " + withArticle(recordText(m.type, m.count)));
        }
        if (++next_ == items_.size()) {
            next_ = 0;
            stepOpen_ = false;
        }
        return std::nullopt;
    }

    // ---- The load through the library ------------------------------------------

    std::optional<Problem> loadThroughApi() {
        int32_t status = 0;
        const GridFile grid(info_.path, &status);
        if (status != F_NO_ERROR) {
            return Problem{info_.appBase, "the gridded data-file reader refuses the header: status " + statusText(status)};
        }
        const HeaderHandle h = grid.header();
        if (grdGetNoOfItems(h) != static_cast<int32_t>(items_.size())) {
            return Problem{info_.appBase, "the reader finds " + std::to_string(grdGetNoOfItems(h)) + " items, the file holds " +
                                              std::to_string(items_.size())};
        }
        // Every static item after the encoding keys, which the reader has taken.
        const size_t keys = compressed_ ? std::min<size_t>(3, statics_.size()) : 0;
        for (size_t n = keys; n < statics_.size(); ++n) {
            const StaticPtr item = readStatic(grid.file(), &status);
            if (!item) {
                return Problem{statics_[n].offset, "the reader cannot read static item " + std::to_string(n + 1) +
                                                       ": status " + statusText(status)};
            }
        }
        return readSteps(h, grid.file());
    }

    // The first and the last time step as the header counts them, positioned
    // with the library's search.
    std::optional<Problem> readSteps(HeaderHandle h, FileHandle f) {
        const int64_t steps = std::min<int64_t>(headerSteps_, stepsSeen_);
        if (steps == 0 || items_.empty() || !strictSteps_) return std::nullopt;
        // A compressed item is read into its whole grid: a small file may
        // claim a grid too large to read into memory.
        uint64_t largest = 0;
        for (const Shape& item : items_) {
            largest = std::max(largest, static_cast<uint64_t>(item.elements) * elementSizeOf(item.dataType));
        }
        if (largest > std::max<uint64_t>(8 * info_.size, uint64_t{1} << 26)) {
            notes_.push_back("an item's grid is far larger than the file: its time steps were not read through the library");
            return std::nullopt;
        }
        std::vector<unsigned char> buffer(std::max<size_t>(static_cast<size_t>(largest), 8));
        for (const int64_t t : {int64_t{0}, steps - 1}) {
            const int64_t offset = stepOffsets_[static_cast<size_t>(t)];
            int32_t status = grdFindTimeStep(h, f, static_cast<int32_t>(t));
            if (status != F_NO_ERROR) {
                return Problem{offset, "the library cannot find time step " + std::to_string(t) + ": status " + statusText(status)};
            }
            for (size_t n = 0; n < items_.size(); ++n) {
                double time = 0;
                status = grdReadItemTimeStep(h, f, &time, buffer.data());
                if (status != F_NO_ERROR) {
                    return Problem{offset, "the library cannot read item " + std::to_string(n + 1) + " of time step " +
                                               std::to_string(t) + ": status " + statusText(status)};
                }
            }
        }
        return std::nullopt;
    }

    RecordFileInfo info_;
    std::ifstream in_;

    Mark block_;  // the block being walked, and its records so far
    std::array<Mark, kMaxRecords> record_{};
    size_t records_ = 0;

    Section section_ = Section::Start;
    std::vector<uint32_t> fields_;  // header field tags seen
    uint32_t timeBlock_ = 0;
    int32_t fileType_ = 0;
    bool compressed_ = false;
    int64_t keyLength_ = 0;
    int32_t headerSteps_ = 0;
    int64_t itemCount_ = -1;
    std::vector<Shape> items_;
    std::vector<Shape> statics_;
    bool pendingStatic_ = false;  // a static item record waits for its values
    Step step_ = Step::None;      // of the item group being walked
    bool customSeen_ = false;
    std::vector<int64_t> stepOffsets_;  // of each 50001 block
    int64_t stepsSeen_ = 0;
    size_t next_ = 0;           // item record due next in the time step
    bool stepOpen_ = false;     // the last time step still lacks item records
    bool strictSteps_ = false;  // the file type fixes the records of a time step
};

}  // namespace

std::unique_ptr<KindCheck> gridCheck(const RecordFileInfo& info) { return std::make_unique<GridCheck>(info); }

}  // namespace tova_cli
