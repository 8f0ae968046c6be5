// metainfo frames FILE [--stream N] [--seek MS]: an AVI file's index and
// frames, read through the exported parser object.
#pragma once

#include <cstdint>
#include <string>

namespace probe {

// 0, or 1 when the file or a read fails.
int FramesCommand(const std::string& path, uint32_t stream, bool seek, uint32_t seekMs);

}  // namespace probe
