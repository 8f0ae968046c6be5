// What one query learnt from a file, kept per thread for the next query of
// the same file: a probe asks for clip information, then the codec, and both
// may come from one walk. The file is known by its identity, where in it the
// walk began, and when its bytes were read; a file that had not settled then
// (see LearntAfterSettling) is walked anew by every query.
#pragma once

#include <cstdint>

#include "core/file_access.h"
#include "core/read_cache.h"

namespace metainfo {

struct FileMemoKey {
    bool valid = false;  // a handle without identity (protected, no regular file) has no key
    FileIdentity id;
    int64_t start = 0;
    int64_t readNs = 0;

    // The key of what is about to be read from the handle's position.
    static FileMemoKey Of(int h) {
        FileMemoKey key;
        key.valid = HandleIdentity(h, &key.id);
        key.start = MEx_ftell(h);
        key.readNs = NowNs();
        return key;
    }
};

// One value a thread keeps: declare it thread_local.
template <typename Value>
class FileMemo {
public:
    // True (and *value filled) when the value was learnt from the same bytes
    // of a file that had settled before they were read.
    bool Recall(const FileMemoKey& key, Value* value) const {
        if (!key.valid || !key_.valid || !(key_.id == key.id) || key_.start != key.start ||
            !LearntAfterSettling(key_.id, key_.readNs)) {
            return false;
        }
        *value = value_;
        return true;
    }
    void Remember(const FileMemoKey& key, const Value& value) {
        if (!key.valid) return;
        key_ = key;
        value_ = value;
    }

private:
    FileMemoKey key_;
    Value value_{};
};

}  // namespace metainfo
