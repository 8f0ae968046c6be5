#include <sys/wait.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>

#include "peer.h"

namespace bench {
namespace {

// mutagen runs in a python3 process of its own that times each job itself;
// the pipe in between is outside the measurement.
class MutagenPeer : public Peer {
public:
    MutagenPeer(pid_t pid, FILE* to, FILE* from) : pid_(pid), to_(to), from_(from) {}
    ~MutagenPeer() override {
        std::fclose(to_);
        std::fclose(from_);
        int status = 0;
        ::waitpid(pid_, &status, 0);
    }
    std::string Name() const override { return "mutagen"; }
    Sample Run(const std::string& path) override {
        Sample s;
        std::fprintf(to_, "%s\n", path.c_str());
        std::fflush(to_);
        int ok = 0;
        long long ns = 0;
        long long bytes = 0;
        if (std::fscanf(from_, "%d %lld %lld", &ok, &ns, &bytes) == 3) {
            s.ok = ok != 0;
            s.ns = ns;
            s.bytes = bytes;
        }
        return s;
    }

private:
    pid_t pid_;
    FILE* to_;
    FILE* from_;
};

}  // namespace

std::unique_ptr<Peer> MakeMutagenPeer(const std::string& worker, const std::string& python) {
    const std::string probe = "'" + python + "' -c 'import mutagen' >/dev/null 2>&1";
    if (std::system(probe.c_str()) != 0) return nullptr;
    int down[2];
    int up[2];
    if (::pipe(down) != 0) return nullptr;
    if (::pipe(up) != 0) {
        ::close(down[0]);
        ::close(down[1]);
        return nullptr;
    }
    const pid_t pid = ::fork();
    if (pid < 0) return nullptr;
    if (pid == 0) {
        ::dup2(down[0], 0);
        ::dup2(up[1], 1);
        ::close(down[1]);
        ::close(up[0]);
        ::execl(python.c_str(), python.c_str(), worker.c_str(), static_cast<char*>(nullptr));
        ::_exit(127);
    }
    ::close(down[0]);
    ::close(up[1]);
    return std::make_unique<MutagenPeer>(pid, ::fdopen(down[1], "w"), ::fdopen(up[0], "r"));
}

}  // namespace bench
