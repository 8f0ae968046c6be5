#pragma once

namespace metainfo {

// Removes ID3 unsynchronisation in place: FF 00 becomes FF; the byte after an
// FF is never itself taken as an FF. Returns the new length.
int Sync(unsigned char* buf, int len);

}  // namespace metainfo
