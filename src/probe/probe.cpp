// The accurate interface: one probe into facts, handed out as an mi_info.
#include "metainfo/probe.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <new>
#include <vector>

#include "core/facts.h"
#include "metainfo/metainfo.h"
#include "probe/facts_readers.h"
#include "probe/picture_copy.h"

namespace metainfo {
namespace {

// What an mi_info points into; freed whole by mi_info_free.
struct Owner {
    MediaFacts facts;
    int type = MEDIA_TYPE_UNKNOWN;
    FileStamp stamp;
    mi_info info{};
    std::vector<mi_stream> streams;
    std::vector<mi_tag> tags;
    std::vector<mi_picture> pictures;
};

const char* TextOrNull(const std::string& s) { return s.empty() ? nullptr : s.c_str(); }

mi_stream StreamOf(const StreamFacts& s) {
    mi_stream out{};
    out.kind = s.kind == StreamFacts::kVideo ? MI_STREAM_VIDEO : MI_STREAM_AUDIO;
    out.codec = TextOrNull(s.codec);
    out.profile = TextOrNull(s.profile);
    out.level = s.level;
    out.sample_rate = s.sampleRate;
    out.channels = s.channels;
    out.bits_per_sample = s.bitsPerSample;
    out.width = s.width;
    out.height = s.height;
    out.frame_rate_num = s.frameRateNum;
    out.frame_rate_den = s.frameRateDen;
    out.bit_rate = s.bitRate;
    return out;
}

mi_picture PictureOf(const PictureFacts& p) {
    mi_picture out{};
    out.mime = TextOrNull(p.mime);
    out.type = p.type;
    out.description = TextOrNull(p.description);
    out.size = p.size;
    out.offset = p.offset;
    out.flags = p.unsynchronised ? MI_PICTURE_UNSYNCHRONISED : 0u;
    return out;
}

void FillTags(const TagFacts& t, mi_info* info) {
    info->title = TextOrNull(t.title);
    info->artist = TextOrNull(t.artist);
    info->album = TextOrNull(t.album);
    info->album_artist = TextOrNull(t.albumArtist);
    info->genre = TextOrNull(t.genre);
    info->date = TextOrNull(t.date);
    info->comment = TextOrNull(t.comment);
    info->composer = TextOrNull(t.composer);
    info->year = t.year;
    info->track = t.track;
    info->track_total = t.trackTotal;
    info->disc = t.disc;
    info->disc_total = t.discTotal;
}

// Points the C view at the facts; the facts do not change after this.
void FillInfo(Owner* o) {
    const MediaFacts& f = o->facts;
    mi_info& info = o->info;
    info.format = TextOrNull(f.format);
    info.mime = TextOrNull(f.mime);
    info.duration_ms = f.durationUs < 0 ? -1 : (f.durationUs + 500) / 1000;
    info.duration_exact = f.durationUs >= 0 && f.durationExact ? 1 : 0;
    info.bit_rate = f.bitRate;
    for (const StreamFacts& s : f.streams) o->streams.push_back(StreamOf(s));
    for (const auto& tag : f.tags.extra) o->tags.push_back(mi_tag{tag.first.c_str(), tag.second.c_str()});
    for (const PictureFacts& p : f.pictures) o->pictures.push_back(PictureOf(p));
    info.stream_count = o->streams.size();
    info.streams = o->streams.empty() ? nullptr : o->streams.data();
    FillTags(f.tags, &info);
    info.tag_count = o->tags.size();
    info.tags = o->tags.empty() ? nullptr : o->tags.data();
    info.picture_count = o->pictures.size();
    info.pictures = o->pictures.empty() ? nullptr : o->pictures.data();
    info.internal = o;
}

int ErrnoResult(int error) {
    switch (error) {
        case ENOENT:
        case ENOTDIR: return MI_E_NOT_FOUND;
        case EACCES:
        case EPERM: return MI_E_ACCESS;
        case EISDIR: return MI_E_IS_DIRECTORY;
        case ENOMEM: return MI_E_NO_MEMORY;
        default: return MI_E_IO;
    }
}

// Why a path cannot be probed, before any parser sees it; MI_OK when it can.
int CheckFile(const char* path, FileStamp* stamp) {
    struct stat st;
    if (::stat(path, &st) != 0) return ErrnoResult(errno);
    if (S_ISDIR(st.st_mode)) return MI_E_IS_DIRECTORY;
    if (!S_ISREG(st.st_mode)) return MI_E_NOT_MEDIA;
    const int fd = ::open(path, O_RDONLY | O_CLOEXEC);
    if (fd < 0) return ErrnoResult(errno);
    ::close(fd);
    if (st.st_size == 0) return MI_E_EMPTY;
    *stamp = StampOf(st);
    return MI_OK;
}

int Probe(const char* path, mi_info** out) {
    FileStamp stamp;
    const int checked = CheckFile(path, &stamp);
    if (checked != MI_OK) return checked;
    const int type = AccurateMediaType(path);
    if (type == MEDIA_TYPE_UNKNOWN) return MI_E_NOT_MEDIA;
    auto* owner = new (std::nothrow) Owner;
    if (owner == nullptr) return MI_E_NO_MEMORY;
    owner->type = type;
    owner->stamp = stamp;
    const int32_t read = ReadFacts(path, type, &owner->facts);
    if (read != MM_OK) {
        delete owner;
        return read == MM_E_OUTOFMEMORY ? MI_E_NO_MEMORY : MI_E_DAMAGED;
    }
    // The overall rate counts every byte of the file over its play time, as
    // ffprobe and MediaInfo do.
    MediaFacts& f = owner->facts;
    if (f.durationUs > 0) f.bitRate = static_cast<uint64_t>(static_cast<long double>(stamp.size) * 8e6L / f.durationUs);
    FillInfo(owner);
    *out = &owner->info;
    return MI_OK;
}

}  // namespace
}  // namespace metainfo

using namespace metainfo;

extern "C" {

int mi_probe(const char* path, mi_info** info) {
    if (info == nullptr) return MI_E_ARGUMENT;
    *info = nullptr;
    if (path == nullptr || *path == '\0') return MI_E_ARGUMENT;
    try {
        return Probe(path, info);
    } catch (const std::bad_alloc&) {
        return MI_E_NO_MEMORY;
    }
}

void mi_info_free(mi_info* info) {
    if (info != nullptr) delete static_cast<const Owner*>(info->internal);
}

int mi_picture_copy(const char* path, const mi_info* info, size_t index, void* buffer, size_t capacity, size_t* size) {
    if (path == nullptr || info == nullptr || size == nullptr) return MI_E_ARGUMENT;
    const auto* owner = static_cast<const Owner*>(info->internal);
    if (owner == nullptr || index >= owner->facts.pictures.size()) return MI_E_ARGUMENT;
    const PictureFacts& picture = owner->facts.pictures[index];
    *size = static_cast<size_t>(picture.size);
    if (picture.size > SIZE_MAX) return MI_E_NO_MEMORY;
    if (buffer == nullptr || capacity < picture.size) return MI_E_BUFFER;
    try {
        return CopyPicture(path, owner->type, owner->stamp, picture, static_cast<unsigned char*>(buffer));
    } catch (const std::bad_alloc&) {
        return MI_E_NO_MEMORY;
    }
}

const char* mi_result_text(int result) {
    switch (result) {
        case MI_OK: return "ok";
        case MI_E_ARGUMENT: return "invalid argument";
        case MI_E_NOT_FOUND: return "no such file";
        case MI_E_ACCESS: return "permission denied";
        case MI_E_IS_DIRECTORY: return "is a directory";
        case MI_E_IO: return "read error, or the file changed since it was probed";
        case MI_E_EMPTY: return "empty";
        case MI_E_NOT_MEDIA: return "not a media file";
        case MI_E_DAMAGED: return "damaged or truncated";
        case MI_E_NO_MEMORY: return "out of memory";
        case MI_E_BUFFER: return "buffer too small";
        default: return "unknown result";
    }
}

}  // extern "C"
