#include "scan_command.h"

#include <sys/stat.h>

#include <chrono>
#include <cstdio>
#include <ctime>
#include <thread>
#include <unordered_map>
#include <utility>

#include "progress.h"
#include "schema.h"
#include "store.h"
#include "walk.h"
#include "work_pool.h"
#include "writer_lock.h"

namespace scan {
namespace {

constexpr size_t kRowsPerCommit = 200;
constexpr auto kCommitEvery = std::chrono::seconds(1);

// A file the database knows, under one of the roots.
struct Known {
    int64_t id, size, mtimeNs, inode, device;
    bool seen = false;
};

bool Under(const std::string& path, const std::string& root) {
    if (root == "/") return !path.empty() && path[0] == '/';
    return path.compare(0, root.size(), root) == 0 && (path.size() == root.size() || path[root.size()] == '/');
}

bool Same(const Known& k, const FileStat& f) {
    return k.size == f.size && k.mtimeNs == f.mtimeNs && k.inode == f.inode && k.device == f.device;
}

// Writes rows in transactions of a few hundred files or a second, whichever
// comes first: a killed scan loses at most that much work.
class Batch {
public:
    explicit Batch(Db* db) : db_(db) {}
    ~Batch() {
        if (open_) sqlite3_exec(db_->Handle(), "ROLLBACK", nullptr, nullptr, nullptr);
    }
    void Begin() {
        if (open_) return;
        db_->Exec("BEGIN IMMEDIATE");
        open_ = true;
        started_ = std::chrono::steady_clock::now();
        rows_ = 0;
    }
    void Wrote() {
        ++rows_;
        CommitIfDue();
    }
    // Also while the walk or a slow file keeps rows from coming.
    void CommitIfDue() {
        if (open_ && (rows_ >= kRowsPerCommit || std::chrono::steady_clock::now() - started_ >= kCommitEvery)) Commit();
    }
    void Commit() {
        if (!open_) return;
        db_->Exec("COMMIT");
        open_ = false;
    }

private:
    Db* db_;
    bool open_ = false;
    size_t rows_ = 0;
    std::chrono::steady_clock::time_point started_;
};

class Scan {
public:
    Scan(const ScanOptions& o, Db* db)
        : options_(o),
          db_(db),
          store_(db),
          batch_(db),
          byInode_(db->Handle(), "SELECT id, path, size, mtime_ns FROM files WHERE device = ? AND inode = ?"),
          now_(static_cast<int64_t>(std::time(nullptr))) {
        const std::string abs = AbsolutePath(o.db);
        for (const char* end : {"", "-wal", "-shm", "-journal", ".lock"}) own_.push_back(abs + end);
        for (const std::string& r : o.roots) roots_.push_back(AbsolutePath(r));
    }

    int Run() {
        LoadKnown();
        const unsigned jobs = options_.jobs != 0 ? options_.jobs : std::max(1u, std::thread::hardware_concurrency());
        WorkPool pool(jobs, options_.pictures);
        pool_ = &pool;
        WalkEvents events;
        events.file = [this](const FileStat& f) { Found(f); };
        events.folder = [this](const std::string& path) {
            folder_ = path;
            batch_.CommitIfDue();
            progress_.Tick(counts_, folder_);
        };
        events.unreadable = [this](const std::string& path, const std::string& why) {
            progress_.Clear();
            std::fprintf(stderr, "metainfo: %s: %s\n", path.c_str(), why.c_str());
            unreadable_.push_back(path);
        };
        for (const std::string& root : roots_) Walk(root, {options_.follow, options_.crossFilesystems}, events);
        while (pool.Pending() != 0) {
            for (Probed& p : pool.Collect(true)) Write(p);
            batch_.CommitIfDue();
            progress_.Tick(counts_, folder_);
        }
        RemoveGone();
        batch_.Commit();
        progress_.Finish(counts_);
        return unreadable_.empty() ? 0 : 1;
    }

private:
    void LoadKnown() {
        Statement s(db_->Handle(), "SELECT id, path, size, mtime_ns, inode, device FROM files");
        while (s.Step()) {
            std::string path = s.Text(1);
            bool under = false;
            for (const std::string& root : roots_) under = under || Under(path, root);
            if (!under) continue;
            // A NULL mtime (an upgraded row) matches no file: it is probed again.
            const int64_t mtime = s.IsNull(3) ? -1 : s.Int(3);
            known_.emplace(std::move(path), Known{s.Int(0), s.Int(2), mtime, s.Int(4), s.Int(5)});
        }
    }

    void Found(const FileStat& f) {
        for (const std::string& own : own_) {
            if (f.path == own) return;
        }
        ++counts_.found;
        Probed task;
        task.file = f;
        const auto it = known_.find(f.path);
        if (it != known_.end()) {
            if (it->second.seen) return;  // named twice by overlapping roots
            it->second.seen = true;
            if (!options_.full && Same(it->second, f)) {
                ++counts_.unchanged;
                ++counts_.done;
                progress_.Tick(counts_, folder_);
                return;
            }
            task.id = it->second.id;
        } else if (FindMoved(f, &task)) {
            if (!options_.full) {
                batch_.Begin();
                store_.Move(task.id, f.path);
                batch_.Wrote();
                ++counts_.moved;
                ++counts_.done;
                return;
            }
        }
        pool_->Submit(std::move(task), [this](Probed& p) { Write(p); });
        progress_.Tick(counts_, folder_);
    }

    // A row of the same device and inode, size and time whose name no longer
    // leads to that file: the file was renamed or moved.
    bool FindMoved(const FileStat& f, Probed* task) {
        byInode_.Bind(1, f.device).Bind(2, f.inode);
        while (byInode_.Step()) {
            const std::string old = byInode_.Text(1);
            struct stat st;
            const bool stillThere = ::lstat(old.c_str(), &st) == 0 && static_cast<int64_t>(st.st_ino) == f.inode &&
                                    static_cast<int64_t>(st.st_dev) == f.device;
            if (byInode_.Int(2) != f.size || byInode_.Int(3) != f.mtimeNs || stillThere) continue;
            task->id = byInode_.Int(0);
            task->moved = true;
            const auto it = known_.find(old);
            if (it != known_.end()) it->second.seen = true;
            byInode_.Reset();
            return true;
        }
        byInode_.Reset();
        return false;
    }

    void Write(Probed& p) {
        batch_.Begin();
        store_.Write(p, now_);
        batch_.Wrote();
        ++counts_.done;
        if (p.moved) {
            ++counts_.moved;
        } else if (p.id != 0) {
            ++counts_.changed;
        } else {
            ++counts_.added;
        }
        if (!p.report->problem.empty()) ++counts_.failed;
        if (options_.json) {
            std::printf("%s\n", p.json.dump(-1, ' ', false, probe::Json::error_handler_t::replace).c_str());
            std::fflush(stdout);
        }
        p.report.reset();
    }

    // Rows of files that were not found again, except under folders that
    // could not be read (their files may well be there).
    void RemoveGone() {
        for (const auto& [path, k] : known_) {
            if (k.seen) continue;
            bool unsure = false;
            for (const std::string& u : unreadable_) unsure = unsure || Under(path, u);
            if (unsure) continue;
            batch_.Begin();
            store_.Remove(k.id);
            batch_.Wrote();
            ++counts_.removed;
        }
    }

    const ScanOptions& options_;
    Db* db_;
    Store store_;
    Batch batch_;
    Statement byInode_;
    int64_t now_;
    std::vector<std::string> roots_, own_, unreadable_;
    std::unordered_map<std::string, Known> known_;
    WorkPool* pool_ = nullptr;
    Counts counts_;
    Progress progress_;
    std::string folder_;
};

}  // namespace

int ScanCommand(const ScanOptions& options) {
    WriterLock lock(options.db, options.waitSeconds);
    if (!lock.Held()) {
        std::fprintf(stderr, "metainfo: DB: %s\n", lock.Problem().c_str());
        return 1;
    }
    try {
        Db db(options.db, true);
        db.Exec("PRAGMA journal_mode = WAL; PRAGMA synchronous = NORMAL");
        Migrate(&db);
        return Scan(options, &db).Run();
    } catch (const DbError& e) {
        std::fprintf(stderr, "metainfo: DB: %s\n", e.what());
        return 1;
    }
}

}  // namespace scan
