#include "core/unsync.h"

namespace metainfo {

int Sync(unsigned char* buf, int len) {
    if (buf == nullptr || len <= 0) return 0;
    int read = 0;
    int write = 0;
    while (read < len && write < len) {
        unsigned char c = buf[read++];
        buf[write++] = c;
        if (c != 0xFF) continue;
        // A trailing FF ends the walk: the byte after the buffer is not ours.
        if (read >= len) break;
        unsigned char next = buf[read++];
        if (next != 0x00) buf[write++] = next;
    }
    return write;
}

}  // namespace metainfo
