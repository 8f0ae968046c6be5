// What the later queries of a probe read of a file of each type, brought into
// this thread's cache while the detection has the file open: each later query
// then costs a stat instead of an open.
#pragma once

#include <cstddef>
#include <cstdint>

namespace metainfo {

// h: the detection's open handle; head: the first n bytes of the file.
void ReadAheadForType(int h, int type, const uint8_t* head, size_t n);

}  // namespace metainfo
