// Runs a fuzz target's inputs without libFuzzer, so that the regression inputs
// replay in every build (gcc or clang, with or without sanitizers).
//
//   replay_TARGET [--timeout SECONDS] FILE_OR_DIRECTORY...
//
// A directory's files are replayed in name order (names starting with a dot
// are skipped); a directory that does not exist holds nothing to replay. The
// name of each input is printed before it runs, so that a crash or a hang
// points at its file; --timeout fails an input that runs longer.
#include <dirent.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cstdint>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <fstream>
#include <iterator>
#include <string>
#include <vector>

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data, size_t size);
extern "C" void MetainfoFuzzRemoveScratch();

namespace {

char g_current[4096];

void OnAlarm(int) {
    static const char kPrefix[] = "replay: timeout on ";
    (void)!write(STDERR_FILENO, kPrefix, sizeof kPrefix - 1);
    (void)!write(STDERR_FILENO, g_current, std::strlen(g_current));
    (void)!write(STDERR_FILENO, "\n", 1);
    MetainfoFuzzRemoveScratch();
    _exit(1);
}

bool IsDirectory(const std::string& path) {
    struct stat st;
    return stat(path.c_str(), &st) == 0 && S_ISDIR(st.st_mode);
}

std::vector<std::string> FilesOf(const std::string& dir) {
    std::vector<std::string> files;
    if (DIR* d = opendir(dir.c_str())) {
        while (dirent* e = readdir(d)) {
            if (e->d_name[0] == '.') continue;
            std::string path = dir + "/" + e->d_name;
            if (!IsDirectory(path)) files.push_back(path);
        }
        closedir(d);
    }
    std::sort(files.begin(), files.end());
    return files;
}

bool Replay(const std::string& path, unsigned timeout) {
    std::ifstream in(path, std::ios::binary);
    if (!in) {
        std::fprintf(stderr, "replay: cannot read %s\n", path.c_str());
        return false;
    }
    std::vector<uint8_t> bytes((std::istreambuf_iterator<char>(in)), std::istreambuf_iterator<char>());
    std::fprintf(stderr, "replay: %s (%zu bytes)\n", path.c_str(), bytes.size());
    std::fflush(stderr);
    std::snprintf(g_current, sizeof g_current, "%s", path.c_str());
    alarm(timeout);
    // A copy of exactly the input's size, so that a read past its end is seen.
    uint8_t* copy = static_cast<uint8_t*>(std::malloc(bytes.empty() ? 1 : bytes.size()));
    if (!bytes.empty()) std::memcpy(copy, bytes.data(), bytes.size());
    LLVMFuzzerTestOneInput(copy, bytes.size());
    std::free(copy);
    alarm(0);
    return true;
}

}  // namespace

int main(int argc, char** argv) {
    unsigned timeout = 0;
    std::vector<std::string> inputs;
    for (int i = 1; i < argc; ++i) {
        if (std::strcmp(argv[i], "--timeout") == 0 && i + 1 < argc) {
            timeout = static_cast<unsigned>(std::strtoul(argv[++i], nullptr, 10));
        } else {
            inputs.emplace_back(argv[i]);
        }
    }
    signal(SIGALRM, OnAlarm);
    int replayed = 0;
    bool ok = true;
    for (const std::string& arg : inputs) {
        if (IsDirectory(arg)) {
            for (const std::string& file : FilesOf(arg)) {
                ok = Replay(file, timeout) && ok;
                ++replayed;
            }
        } else if (access(arg.c_str(), F_OK) != 0) {
            std::fprintf(stderr, "replay: %s does not exist, nothing to replay there\n", arg.c_str());
        } else {
            ok = Replay(arg, timeout) && ok;
            ++replayed;
        }
    }
    std::fprintf(stderr, "replay: %d input(s) done\n", replayed);
    return ok ? 0 : 1;
}
