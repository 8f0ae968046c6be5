// metainfo frames: the AVI index and frames as the parser object delivers them.
#pragma once

namespace probe {

int FramesCommand(int argc, char** argv);

}  // namespace probe
