// Gridded data-file layer, in-place header updates: the header stream held
// in memory (see grdimage.h). The bytes are parsed as the record layer lays
// them out: a block is 0xFE, its 16-bit tag, data records (type 1-7, a
// 32-bit count, the elements) and 0xFF; numbers are in the file's byte order.
#include "grd/grdimage.h"

#include <algorithm>
#include <cstring>

#include "grd/fileio.h"
#include "tova/status.h"

namespace {

constexpr unsigned char kBlockStart = 0xFE;
constexpr unsigned char kBlockEnd = 0xFF;
constexpr size_t kFirstRead = 64 * 1024;
constexpr size_t kMaxTransfer = size_t{1} << 30;  // one raw transfer counts in 32 bits

size_t elementSize(int32_t type) {
    switch (type) {
        case RCF_FLOAT: case RCF_INT4: case RCF_UINT4: return 4;
        case RCF_DOUBLE: return 8;
        case RCF_BYTE: return 1;
        case RCF_INT2: case RCF_UINT2: return 2;
        default: return 0;
    }
}

uint32_t swapped(uint32_t v) {
    return (v >> 24) | ((v >> 8) & 0xFF00u) | ((v << 8) & 0xFF0000u) | (v << 24);
}

void reverseEach(unsigned char* p, size_t size, size_t count) {
    if (size < 2) return;
    for (size_t i = 0; i < count; ++i, p += size) std::reverse(p, p + size);
}

}  // namespace

GrdStreamImage::GrdStreamImage(FileHandle edit, int64_t hint) : edit_(edit), hint_(hint) {}

// Makes the first end bytes of the stream available, reading what is
// missing (at least what the hint says, else twice what is held) in one go;
// false when the file ends before them or the read fails.
bool GrdStreamImage::ensure(size_t end) {
    if (end <= bytes_.size()) return true;
    if (readError_ != F_NO_ERROR) return false;
    const int64_t start = static_cast<int64_t>(edit_->appBase);
    const int64_t here = start + static_cast<int64_t>(bytes_.size());
    if (fileSize_ < 0) {
        rcfSeek64(edit_, 0, 0, 2);
        fileSize_ = rcfTell64(edit_);
        grdSeekTo(edit_, here);
        if (edit_->error != F_NO_ERROR || fileSize_ < here) {
            readError_ = edit_->error != F_NO_ERROR ? rcfGetError(edit_) : F_ERR_READ;
            return false;
        }
    }
    const auto available = static_cast<uint64_t>(fileSize_ - here);
    if (end - bytes_.size() > available) return false;
    const size_t wanted = std::max({end, static_cast<size_t>(std::max<int64_t>(hint_, 0)), 2 * bytes_.size(),
                                    kFirstRead});
    const size_t more = static_cast<size_t>(std::min<uint64_t>(wanted - bytes_.size(), available));
    const size_t held = bytes_.size();
    bytes_.resize(held + more);
    for (size_t done = 0; done < more;) {
        const size_t n = std::min(more - done, kMaxTransfer);
        if (rcfReadRaw(bytes_.data() + held + done, 1, static_cast<uint32_t>(n), edit_, 0) == 0) {
            bytes_.resize(held);
            readError_ = rcfGetError(edit_);
            if (readError_ == F_EOF) readError_ = F_ERR_READ;  // the file shrank under us
            return false;
        }
        done += n;
    }
    return true;
}

int32_t GrdStreamImage::next(Block& block) {
    block = Block{};
    block.offset = cursor_;
    if (!ensure(cursor_ + 3) || bytes_[cursor_] != kBlockStart) {
        // The end of the file, or anything that is not a block: the stream ends.
        return readError_;
    }
    uint16_t tag = 0;
    std::memcpy(&tag, &bytes_[cursor_ + 1], 2);
    if (edit_->swapBytes != 0) tag = static_cast<uint16_t>((tag >> 8) | (tag << 8));
    block.tag = tag;
    if (tag == 0) return F_NO_ERROR;
    size_t end = 0;
    const int32_t status = readRecords(cursor_ + 3, &end);
    if (status != F_NO_ERROR) {
        block.tag = 0;
        return status;
    }
    cursor_ = end;
    block.records = view_.empty() ? nullptr : view_.data();
    return F_NO_ERROR;
}

// Parses the records of a block from at up to its terminator (end: just
// after it) into view_, whose data point into the image (or, for a file in
// the other byte order, into swapped_).
int32_t GrdStreamImage::readRecords(size_t at, size_t* end) {
    view_.clear();
    std::vector<size_t> offsets;
    size_t p = at;
    for (;;) {
        if (!ensure(p + 1)) return readError_ != F_NO_ERROR ? readError_ : F_ERR_SKIP;
        const unsigned char type = bytes_[p];
        if (type == kBlockEnd) break;
        const size_t size = elementSize(type);
        if (size == 0 || !ensure(p + 5)) return readError_ != F_NO_ERROR ? readError_ : F_ERR_SKIP;
        uint32_t count = 0;
        std::memcpy(&count, &bytes_[p + 1], 4);
        if (edit_->swapBytes != 0) count = swapped(count);
        const uint64_t bytes = uint64_t{count} * size;
        if (count == 0 || bytes > SIZE_MAX - p - 5 || !ensure(p + 5 + static_cast<size_t>(bytes)))
            return readError_ != F_NO_ERROR ? readError_ : F_ERR_SKIP;
        view_.push_back(LrecNode{type, count, 0, nullptr, nullptr});
        offsets.push_back(p + 5);
        p += 5 + static_cast<size_t>(bytes);
    }
    *end = p + 1;
    // Pointers only now: reading may have moved the image.
    if (edit_->swapBytes != 0) {
        swapped_.clear();
        for (size_t i = 0; i < view_.size(); ++i) {
            const size_t n = view_[i].count * elementSize(view_[i].type);
            swapped_.insert(swapped_.end(), bytes_.begin() + static_cast<std::ptrdiff_t>(offsets[i]),
                            bytes_.begin() + static_cast<std::ptrdiff_t>(offsets[i] + n));
        }
        size_t q = 0;
        for (LrecNode& r : view_) {
            const size_t size = elementSize(r.type);
            reverseEach(&swapped_[q], size, r.count);
            r.data = &swapped_[q];
            q += r.count * size;
        }
    } else {
        for (size_t i = 0; i < view_.size(); ++i) view_[i].data = &bytes_[offsets[i]];
    }
    for (size_t i = 0; i + 1 < view_.size(); ++i) view_[i].next = &view_[i + 1];
    return F_NO_ERROR;
}

// Copies bytes into the image at at, widening the changed range by the
// bytes that differ.
void GrdStreamImage::put(size_t at, const void* data, size_t bytes) {
    const auto* src = static_cast<const unsigned char*>(data);
    unsigned char* dst = &bytes_[at];
    size_t first = 0;
    while (first < bytes && dst[first] == src[first]) ++first;
    if (first == bytes) return;
    size_t last = bytes;
    while (last > first && dst[last - 1] == src[last - 1]) --last;
    std::memcpy(dst + first, src + first, last - first);
    dirtyBegin_ = std::min(dirtyBegin_, at + first);
    dirtyEnd_ = std::max(dirtyEnd_, at + last);
}

void GrdStreamImage::replace(const Block& block, const LrecNode* list) {
    size_t p = block.offset + 3;
    std::vector<unsigned char> foreign;
    for (const LrecNode* r = list; r != nullptr; r = r->next) {
        const size_t size = elementSize(r->type);
        const size_t n = size * r->count;
        const void* src = r->data;
        if (edit_->swapBytes != 0 && size > 1 && src != nullptr) {
            foreign.assign(static_cast<const unsigned char*>(src), static_cast<const unsigned char*>(src) + n);
            reverseEach(foreign.data(), size, r->count);
            src = foreign.data();
        }
        // The record's header (type and count) is the same by construction.
        if (src != nullptr) {
            put(p + 5, src, n);
        } else {
            foreign.assign(n, 0);
            put(p + 5, foreign.data(), n);
        }
        p += 5 + n;
    }
}

int32_t GrdStreamImage::store() {
    if (dirtyBegin_ >= dirtyEnd_) return F_NO_ERROR;
    grdSeekTo(edit_, static_cast<int64_t>(edit_->appBase) + static_cast<int64_t>(dirtyBegin_));
    for (size_t done = dirtyBegin_; done < dirtyEnd_ && edit_->error == F_NO_ERROR;) {
        const size_t n = std::min(dirtyEnd_ - done, kMaxTransfer);
        rcfWriteRaw(&bytes_[done], 1, static_cast<uint32_t>(n), edit_);
        done += n;
    }
    dirtyBegin_ = SIZE_MAX;
    dirtyEnd_ = 0;
    return edit_->error;
}
