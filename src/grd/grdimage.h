// Gridded data-file layer, in-place header updates: the header stream of a
// file held as bytes in memory. An update reads the stream once through its
// editing handle, replaces blocks in memory (only by blocks of the same
// records, so that no byte moves) and writes the bytes that changed back in
// one transfer: the system calls of an update do not grow with the number of
// items. A writer killed during that transfer leaves each block with its old
// or its new values in the same layout, which readers and recovery take as
// they are.
#pragma once

#include <cstddef>
#include <cstdint>
#include <vector>

#include "rcf/rcf_internal.h"

class GrdStreamImage {
public:
    // One block of the stream: its tag (0 when the stream ends here: end of
    // the file, or a record that is no block start), where its start mark
    // lies in the image and its records, in host byte order, valid until
    // the next call of next().
    struct Block {
        uint16_t tag = 0;
        size_t offset = 0;
        LrecNode* records = nullptr;
    };

    // edit is positioned at appBase; hint, when above 0, is how many bytes
    // the stream is expected to take (read at once).
    GrdStreamImage(FileHandle edit, int64_t hint);
    GrdStreamImage(const GrdStreamImage&) = delete;
    GrdStreamImage& operator=(const GrdStreamImage&) = delete;

    // Parses the next block. 0, 2016 (a block cut short or holding what no
    // block holds), 2000 (memory) or the read's failure.
    int32_t next(Block& block);
    // Puts the values of list (the records of a block with the same types
    // and counts as block's) in place of block's; bytes that differ are
    // marked for store().
    void replace(const Block& block, const LrecNode* list);
    // Writes the changed bytes back in one transfer; 0 or the write's status.
    int32_t store();

private:
    bool ensure(size_t end);
    int32_t readRecords(size_t at, size_t* end);
    void put(size_t at, const void* data, size_t bytes);

    FileHandle edit_;
    int64_t fileSize_ = -1;
    int64_t hint_ = 0;
    int32_t readError_ = 0;
    std::vector<unsigned char> bytes_;  // from appBase on, as read so far
    size_t cursor_ = 0;                 // start of the next block
    size_t dirtyBegin_ = SIZE_MAX;
    size_t dirtyEnd_ = 0;
    std::vector<LrecNode> view_;              // records of the current block
    std::vector<unsigned char> swapped_;      // their values in host order (foreign-order files)
};
