// Writes a small record file with typed records and logical blocks, reads
// it back and prints what it holds: the header (stamps, versions, bases)
// and every record and block in order.
//
//   rcf_demo [path]     (default sample.rcf)
#include <cinttypes>
#include <cstdio>
#include <cstring>
#include <string>

#include "grd/fileio.h"
#include "rcf/rcf_internal.h"

namespace {

std::string valuesText(int32_t type, uint32_t count, const void* data) {
    std::string text;
    const uint32_t shown = count < 8 ? count : 8;
    char item[64];
    for (uint32_t i = 0; i < shown; ++i) {
        switch (type) {
        case RCF_FLOAT: std::snprintf(item, sizeof(item), "%g", static_cast<const float*>(data)[i]); break;
        case RCF_DOUBLE: std::snprintf(item, sizeof(item), "%.15g", static_cast<const double*>(data)[i]); break;
        case RCF_BYTE: std::snprintf(item, sizeof(item), "%u", static_cast<const uint8_t*>(data)[i]); break;
        case RCF_INT4: std::snprintf(item, sizeof(item), "%" PRId32, static_cast<const int32_t*>(data)[i]); break;
        case RCF_UINT4: std::snprintf(item, sizeof(item), "%" PRIu32, static_cast<const uint32_t*>(data)[i]); break;
        case RCF_INT2: std::snprintf(item, sizeof(item), "%d", static_cast<const int16_t*>(data)[i]); break;
        case RCF_UINT2: std::snprintf(item, sizeof(item), "%u", static_cast<const uint16_t*>(data)[i]); break;
        default: std::snprintf(item, sizeof(item), "?"); break;
        }
        text += (i != 0 ? ", " : "") + std::string(item);
    }
    if (shown < count) text += ", ...";
    return text;
}

void printRecord(const char* indent, int32_t type, uint32_t count, const void* data) {
    std::printf("%s%-10s x %-4" PRIu32 " {%s}\n", indent, rcfSimpName(type), count, valuesText(type, count, data).c_str());
}

int write(const char* path) {
    FileHandle f = FOpenFileCreate(path, 1);
    if (f == nullptr) return 1;

    const char title[] = "tova record-file demo";
    rcfLrecWrite(f, RCF_BYTE, sizeof(title), title);
    const int32_t dims[3] = {120, 80, 12};
    rcfLrecWrite(f, RCF_INT4, 3, dims);

    // A block of mixed records, as the gridded files store their header fields.
    const double origin[2] = {512300.5, 6170120.25};
    const float deleteValue = -1e-35f;
    const uint16_t flags[4] = {1, 0, 65535, 7};
    LrecNode* block = FCreateLogicalBlock(RCF_DOUBLE, 2, origin);
    FAppendToLogicalBlock(RCF_FLOAT, 1, &deleteValue, block);
    FAppendToLogicalBlock(RCF_UINT2, 4, flags, block);
    const int32_t status = grdCheckWriteLB(nullptr, 10007, block, f, "rcf_demo", __LINE__);
    FFreeLogicalBlock(block);

    // An empty block, then a block of one time step's values.
    rcfBlockWrite(50000, f, nullptr);
    float values[100];
    for (int i = 0; i < 100; ++i) values[i] = static_cast<float>(i) * 0.25f;
    block = FCreateLogicalBlock(RCF_FLOAT, 100, values);
    rcfBlockWrite(50001, f, block);
    FFreeLogicalBlock(block);
    const int16_t tail[3] = {-1, 2, -3};
    rcfLrecWrite(f, RCF_INT2, 3, tail);

    const int32_t closed = FCloseFile(&f);
    return status != 0 || closed != 0 ? 1 : 0;
}

int read(const char* path) {
    int32_t status = 0;
    FileHandle f = FOpenFileRead(path, &status);
    if (f == nullptr) {
        std::printf("open failed: %d\n", status);
        return 1;
    }
    std::printf("file        %s\n", rcfGetFilename(f));
    std::printf("created     %s %s (layer %" PRIu32 ", application %" PRIu32 ")\n", rcfGetFileCreationDate(f),
                rcfGetFileCreationTime(f), rcfGetVersionCreate(f), rcfGetVersionCreateApp(f));
    std::printf("edited      %s %s (layer %" PRIu32 ", application %" PRIu32 ")\n", rcfGetFileEditDate(f),
                rcfGetFileEditTime(f), rcfGetVersionEdit(f), rcfGetVersionEditApp(f));
    std::printf("bases       rcfBase %" PRIu32 ", appBase %" PRIu32 "\n", rcfGetRCFbase(f), rcfGetAppBase(f));
    std::printf("records\n");

    for (;;) {
        const int64_t at = rcfTell64(f);
        uint32_t count = 0;
        const int32_t type = rcfQuery(f, &count);
        if (type == 0) break;
        if (type == RCF_BLOCK) {
            uint32_t nodes = 0;
            LrecNode* list = nullptr;
            const uint16_t id = rcfBlockRead(f, &nodes, &list);
            std::printf("  @%-6" PRId64 " block %u, %" PRIu32 " record(s)\n", at, id, nodes);
            for (LrecNode* node = list; node != nullptr; node = node->next) {
                printRecord("      ", node->type, node->count, node->data);
            }
            rcfLrecListFree(&list);
        } else {
            int32_t t = 0;
            void* data = rcfLrecReadAlloc(f, &t, &count);
            std::printf("  @%-6" PRId64 " ", at);
            if (t == RCF_BYTE) {
                std::printf("%-10s x %-4" PRIu32 " \"%.*s\"\n", rcfSimpName(t), count, static_cast<int>(count) - 1,
                            static_cast<const char*>(data));
            } else {
                printRecord("", t, count, data);
            }
            rcfLrecFree(&data);
        }
        if (rcfPeekError(f) != 0) break;
    }
    const int32_t error = rcfGetError(f);
    std::printf("end         %s\n", error == F_EOF ? "end of file" : error == 0 ? "ok" : "error");
    FCloseFile(&f);
    return error == F_EOF || error == 0 ? 0 : 1;
}

}  // namespace

int main(int argc, char** argv) {
    const char* path = argc > 1 ? argv[1] : "sample.rcf";
    if (write(path) != 0) {
        std::fprintf(stderr, "rcf_demo: could not write %s\n", path);
        return 1;
    }
    return read(path);
}
