// Record-file layer, module rcf: in-memory record lists (LrecNode) and whole
// logical blocks (block start with a 16-bit identifier, data records,
// terminator). Used by the gridded-data file layer and the cross-section
// code, so it depends on nothing above the record layer.
#include <cstdlib>
#include <cstring>

#include "rcf/rcf_internal.h"

namespace {

constexpr const char* kModule = "..\\rcf\\rcf";

int32_t fail(RcfFile* h, int32_t code, int32_t line) { return h->error = rcfReportError(code, kModule, line); }

}  // namespace

LrecNode* rcfLrecNodeNew(int32_t type, uint32_t count, const void* data, int32_t copy, LrecNode* appendTo) {
    auto* node = rcfAllocationFails() ? nullptr : static_cast<LrecNode*>(std::calloc(1, sizeof(LrecNode)));
    if (node == nullptr) return nullptr;
    node->type = type;
    node->count = count;
    if (copy != 0) {
        // A size of 0 (reported by rcfRecordBytes) still makes a node, without data.
        const uint32_t bytes = rcfRecordBytes(type, count);
        if (bytes != 0) {
            void* buffer = rcfAllocationFails() ? nullptr : std::malloc(bytes);
            if (buffer == nullptr) {
                std::free(node);
                return nullptr;
            }
            if (data != nullptr) {
                std::memcpy(buffer, data, bytes);
            } else {
                std::memset(buffer, 0, bytes);
            }
            node->data = buffer;
            node->ownsData = 1;
        }
    } else {
        node->data = const_cast<void*>(data);
    }
    if (appendTo != nullptr) {
        LrecNode* last = appendTo;
        while (last->next != nullptr) last = last->next;
        last->next = node;
    }
    return node;
}

void rcfLrecListFree(LrecNode** list) {
    if (list == nullptr) return;
    for (LrecNode* node = *list; node != nullptr;) {
        LrecNode* next = node->next;
        if (node->ownsData != 0) std::free(node->data);
        std::free(node);
        node = next;
    }
    *list = nullptr;
}

void* rcfLrecDetachData(LrecNode* node) {
    if (node == nullptr) return nullptr;
    void* data = node->data;
    node->data = nullptr;
    return data;
}

int32_t rcfBlockWrite(uint16_t identifier, FileHandle h, LrecNode* first) {
    if (h == nullptr) return rcfReportError(F_ERR_ARGUMENT, kModule, __LINE__);
    unsigned char start = 0xFE;
    rcfWriteRaw(&start, 1, 1, h);
    rcfWriteRaw(&identifier, 2, 1, h);
    for (LrecNode* node = first; node != nullptr; node = node->next) rcfLrecWrite(h, node->type, node->count, node->data);
    unsigned char end = 0xFF;
    rcfWriteRaw(&end, 1, 1, h);
    return h->error;
}

uint16_t rcfBlockRead(FileHandle h, uint32_t* nodeCount, LrecNode** first) {
    uint32_t countLocal = 0;
    LrecNode* listLocal = nullptr;
    if (nodeCount == nullptr) nodeCount = &countLocal;
    // Without a place to put it the list is read and dropped.
    const bool keep = first != nullptr;
    if (!keep) first = &listLocal;
    *first = nullptr;
    *nodeCount = 0;
    uint16_t identifier = 0;
    if (h == nullptr) return 0;

    uint32_t count = 0;
    uint32_t length = 0;
    const int32_t t = rcfPeekHeader(h, &count, &length);
    if (t == RCF_BLOCK) {
        identifier = static_cast<uint16_t>(count);
        h->inBlock = 1;
        LrecNode* last = nullptr;
        for (;;) {
            int32_t type = 0;
            uint32_t n = 0;
            void* data = rcfLrecReadAlloc(h, &type, &n);
            if (data == nullptr) break;
            LrecNode* node = rcfLrecNodeNew(type, n, data, 0, last);
            if (node == nullptr) {
                std::free(data);
                h->inBlock = 0;
                fail(h, F_ERR_MEMORY, __LINE__);
                break;
            }
            node->ownsData = 1;
            if (*first == nullptr) *first = node;
            ++*nodeCount;
            last = node;
        }
        // The terminator clears inBlock; anything else ended the block early.
        if (h->inBlock != 0) {
            h->inBlock = 0;
            fail(h, F_ERR_SKIP, __LINE__);
        }
    } else if (t != 0) {
        rcfUnpeekHeader(h);
        fail(h, F_ERR_SKIP, __LINE__);
    }
    if (!keep) rcfLrecListFree(first);
    return identifier;
}

int32_t rcfBlockSkip(FileHandle h) {
    if (h == nullptr) return rcfReportError(F_ERR_ARGUMENT, kModule, __LINE__);
    if (h->error != 0) return h->error;
    uint32_t identifier = 0;
    if (rcfQuery(h, &identifier) == RCF_BLOCK) {
        // Records are passed one by one; a nested block is not recognised,
        // so the first terminator ends the skip.
        while (rcfSkip(h) != RCF_TERMINATOR && h->error == 0) {
        }
    } else {
        fail(h, F_ERR_NOT_BLOCK, __LINE__);
    }
    return h->error;
}
