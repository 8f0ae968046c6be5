// One way of answering "what does this file hold": the library under test or
// a peer. A job is whatever the peer does to learn the type, the clip
// information, the tags and the codec of one file.
#pragma once

#include <cstdint>
#include <memory>
#include <string>
#include <vector>

namespace bench {

struct Sample {
    int64_t ns = 0;  // wall time of the job
    int64_t bytes = 0;  // bytes read by the job (rchar of /proc/self/io)
    bool ok = false;  // the peer recognised the file
};

class Peer {
public:
    virtual ~Peer() = default;
    virtual std::string Name() const = 0;
    // Times one job on path; peers in this process share Measure().
    virtual Sample Run(const std::string& path) = 0;
};

// Times job() and counts the bytes this process read meanwhile.
template <typename Job>
Sample Measure(Job&& job);

int64_t ReadCharCount();

std::unique_ptr<Peer> MakeMetainfoPeer();
std::unique_ptr<Peer> MakeAccuratePeer();
// The system calls of a four-query job alone, nothing parsed.
std::unique_ptr<Peer> MakeFloorPeer();
std::unique_ptr<Peer> MakeTaglibPeer(bool fast);
std::unique_ptr<Peer> MakeAvformatPeer(bool streamInfo);
std::unique_ptr<Peer> MakeMediainfoPeer();  // null when built without it
std::unique_ptr<Peer> MakeMutagenPeer(const std::string& worker,
                                      const std::string& python);  // null when python3-mutagen is missing

}  // namespace bench

#include "measure.inl"
