// The VRE rules of `tova check`. A VRE file has no blocks: it is one fixed
// sequence of records (size parameters, then per item its index, its storage
// unit and its values) whose element counts follow from the size parameters
// read before them. This check reads that sequence as the library's writer
// lays it down (format versions 100 and 101), comparing every record's type,
// count, index field and unit with what is due there, and then loads the file
// through the VRE API to see that the reader gets every item.
#include <array>
#include <initializer_list>
#include <memory>
#include <string>
#include <vector>

#include "check.h"
#include "handles.h"
#include "qty/qty.h"
#include "tova/rcf.h"
#include "tova/vre.h"

namespace tova_cli {

namespace {

constexpr const char* kParamName[VRE_SIZE_PARAMS] = {"N0", "body count",  "total panel count", "N3",
                                                     "N4", "parameter 5", "parameter 6",       "N7"};

// What the file's records say so far, and the element counts that follow.
struct Sizes {
    std::array<int64_t, VRE_SIZE_PARAMS> p{};  // p[2] is the sum of the panel counts

    // Element count of vector item k; -1 when a size is negative.
    int64_t elements(int k) const {
        const int64_t b = p[1], pt = p[2], n0 = p[0], n3 = p[3], n4 = p[4], n7 = p[7];
        auto product = [](std::initializer_list<int64_t> factors) -> int64_t {
            int64_t r = 1;
            for (int64_t f : factors) {
                if (f < 0) return -1;
                if (f == 0) return 0;
            }
            for (int64_t f : factors) {
                if (r > INT64_MAX / f) return INT64_MAX;
                r *= f;
            }
            return r;
        };
        switch (k) {
        case 0: return product({12, n0});
        case 1:
        case 3: return product({3, pt});
        case 2: return product({pt});
        case 4: return product({pt, n3});
        case 5:
        case 6: return product({3, b});
        case 7: return product({b});
        case 8: return product({n3, n3});
        case 9:
        case 10: return product({n4});
        case 11: return product({9, b});
        case 12:
        case 13: return product({pt, n4, n3});
        case 14:
        case 15: return product({n4, n3, n3});
        case 21: return product({n7});
        case 22: return product({n7, n4, n3});
        default: return product({b});  // 16 to 20
        }
    }
};

class VreLayout {
public:
    VreLayout(FileHandle file, int64_t size, uint32_t version, VreHandle defaults)
        : f_(file), size_(size), version_(version), defaults_(defaults) {}

    std::optional<Problem> run() {
        param(0);
        group(0);
        if (version_ == 101) param(5);
        param(1);
        if (version_ == 101) {
            bytes(sizes_.p[1] < 0 ? -1 : sizes_.p[1] * VRE_NAME_LENGTH, "the body names");
            for (int k = 16; k <= 20; ++k) group(k);
        }
        ints(2, "the symmetry pair");
        param(3);
        panelCounts();
        for (int k = 1; k <= 4; ++k) group(k);
        param(4);
        scalar(0);
        scalar(1);
        for (int k = 5; k <= 15; ++k) group(k);
        if (version_ == 101) {
            param(6);
            if (sizes_.p[6] == 1) {
                param(7);
                group(21);
                group(22);
            }
        }
        if (!problem_) {
            const int64_t pos = rcfTell64(f_);
            if (pos < size_) fail(pos, "records follow the end of the VRE data");
        }
        return problem_;
    }

    const Sizes& sizes() const { return sizes_; }
    int64_t itemOffset(int k) const { return itemOffsets_[static_cast<size_t>(k)]; }

private:
    void fail(int64_t offset, std::string what) {
        if (!problem_) problem_ = Problem{offset, std::move(what)};
    }

    // Positions on the next record and checks that it is type x count;
    // count -1 means "any". Returns false (with the problem noted) otherwise.
    bool expect(int32_t type, int64_t count, const std::string& what) {
        if (problem_) return false;
        pos_ = rcfTell64(f_);
        uint32_t found = 0;
        const int32_t t = pos_ < size_ ? rcfQuery(f_, &found) : 0;
        const std::string due = withArticle(count >= 0 ? recordText(type, static_cast<uint32_t>(count))
                                                       : std::string(rcfSimpName(type)) + " record");
        if (t == 0) {
            fail(pos_, "the file ends where " + what + " should follow (" + due + ")");
            return false;
        }
        if (t != type || (count >= 0 && found != count)) {
            fail(pos_, what + ": expected " + due + ", found " + withArticle(recordText(t, found)));
            return false;
        }
        return true;
    }

    void readInts(int32_t* values, uint32_t count) {
        if (rcfLrecRead(f_, RCF_INT4, count, values) != count) fail(pos_, "reading failed");
    }

    void skip() { rcfSkip(f_); }

    int32_t readInt(const std::string& what) {
        int32_t value = 0;
        if (expect(RCF_INT4, 1, what)) readInts(&value, 1);
        return value;
    }

    void param(int index) {
        const std::string what =
            std::string("size parameter ") + std::to_string(index) + " (" + kParamName[index] + ")";
        const int64_t at = rcfTell64(f_);
        const int32_t value = readInt(what);
        if (problem_) return;
        if (value < 0) fail(at, what + " is negative (" + std::to_string(value) + ")");
        sizes_.p[static_cast<size_t>(index)] = value;
    }

    void bytes(int64_t count, const std::string& what) {
        if (count == 0 || problem_) return;  // nothing is written for an empty record
        if (count < 0 || count > UINT32_MAX) {
            fail(rcfTell64(f_), what + ": the size parameters give no valid length");
            return;
        }
        if (expect(RCF_BYTE, count, what)) skip();
    }

    void ints(int64_t count, const std::string& what) {
        if (expect(RCF_INT4, count, what)) skip();
    }

    void panelCounts() {
        const int64_t b = sizes_.p[1];
        if (problem_ || b == 0) return;
        if (!expect(RCF_INT4, b, "the panel counts")) return;
        std::vector<int32_t> counts(static_cast<size_t>(b));
        readInts(counts.data(), static_cast<uint32_t>(b));
        int64_t total = 0;
        for (size_t i = 0; i < counts.size(); ++i) {
            if (counts[i] < 0) {
                fail(pos_, "the panel count of body " + std::to_string(i + 1) + " is negative");
                return;
            }
            total += counts[i];
        }
        sizes_.p[2] = total;
    }

    // The index and unit fields of an item group.
    void fields(int k, bool scalar) {
        const std::string name = std::string(scalar ? "scalar item " : "item ") + std::to_string(k);
        const int64_t at = rcfTell64(f_);
        const int32_t index = readInt(name + ", index field");
        if (!problem_ && index != k) fail(at, name + ": the index field says " + std::to_string(index));
        const int64_t unitAt = rcfTell64(f_);
        const int32_t unit = readInt(name + ", unit field");
        if (problem_) return;
        int32_t key = 0, storage = 0, mode = 0, user = 0;
        if (scalar) {
            vreGetScalarItemUnitInfo(defaults_, k, &key, &storage, &mode, &user);
        } else {
            vreGetVectorItemUnitInfo(defaults_, k, &key, &storage, &mode, &user);
        }
        if (!qtyItemUnitEqv(key, unit)) {
            const char* quantity = "?";
            qtyGetItemTypeKey(key, &quantity);
            fail(unitAt, name + ": unit " + std::to_string(unit) + " is not a unit of its quantity " + quantity);
        }
    }

    void group(int k) {
        if (problem_) return;
        itemOffsets_[static_cast<size_t>(k)] = rcfTell64(f_);
        fields(k, false);
        const int64_t n = sizes_.elements(k);
        if (problem_ || n == 0) return;
        if (n < 0 || n > UINT32_MAX) {
            fail(rcfTell64(f_), "item " + std::to_string(k) + ": the size parameters give no valid element count");
            return;
        }
        if (expect(RCF_DOUBLE, n, "item " + std::to_string(k) + " values")) skip();
    }

    void scalar(int k) {
        fields(k, true);
        if (expect(RCF_DOUBLE, 1, "scalar item " + std::to_string(k) + " value")) skip();
    }

    FileHandle f_;
    int64_t size_;
    uint32_t version_;
    VreHandle defaults_;  // gives each item's quantity
    Sizes sizes_;
    std::array<int64_t, VRE_VECTOR_ITEMS> itemOffsets_{};
    int64_t pos_ = 0;
    std::optional<Problem> problem_;
};

class VreCheck final : public KindCheck {
public:
    explicit VreCheck(const RecordFileInfo& info) : info_(info) {}

    std::optional<Problem> mark(const Mark& m, bool) override {
        if (m.type == RCF_BLOCK) return Problem{m.offset, "a block start: VRE files hold no blocks"};
        return std::nullopt;
    }

    std::optional<Problem> finish() override {
        const uint32_t version = info_.versionCreateApp;
        if (version != 100 && version != 101) {
            return Problem{info_.rcfBase + 16,
                           "VRE format version " + std::to_string(version) + " is unknown (100 and 101 are read)"};
        }
        int32_t status = 0;
        RcfFilePtr file = openRecordFile(info_.path, &status);
        if (status != F_NO_ERROR) throw Failure("cannot open " + info_.path + " again: status " + statusText(status));
        const VrePtr defaults(vreHandleCreate());
        if (!defaults) throw Failure("out of memory");
        VreLayout layout(file.get(), static_cast<int64_t>(info_.size), version, defaults.get());
        if (auto problem = layout.run()) return problem;
        file.reset();
        return loadThroughApi(layout);
    }

private:
    // The library's reader must get every item the layout says is there.
    std::optional<Problem> loadThroughApi(const VreLayout& layout) {
        VreHandle opened = nullptr;
        const int32_t status = vreFileRead(info_.path.c_str(), &opened);
        const VrePtr h(opened);
        if (status != F_NO_ERROR) return Problem{0, "the VRE reader failed: status " + statusText(status)};
        const bool tail = version_ == 101 && layout.sizes().p[6] == 1;
        for (int k = 0; k < VRE_VECTOR_ITEMS; ++k) {
            if ((version_ == 100 && k >= 16) || (k >= 21 && !tail)) continue;
            const int64_t due = layout.sizes().elements(k);
            const int32_t got = vreGetVectorSize(h.get(), k);
            if (due > 0 && got != due) {
                return Problem{layout.itemOffset(k), "the VRE reader got " + std::to_string(got) + " of the " +
                                                         std::to_string(due) + " values of item " + std::to_string(k)};
            }
        }
        return std::nullopt;
    }

    RecordFileInfo info_;
    uint32_t version_ = info_.versionCreateApp;
};

}  // namespace

std::unique_ptr<KindCheck> vreCheck(const RecordFileInfo& info) { return std::make_unique<VreCheck>(info); }

}  // namespace tova_cli
