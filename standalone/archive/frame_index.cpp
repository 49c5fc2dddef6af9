// SPDX-License-Identifier: Apache-2.0
#include "standalone/archive/frame_index.h"

#include <algorithm>
#include <array>
#include <bit>
#include <cstddef>
#include <cstring>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/mount_file.h"
#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/base/video.h"

namespace lookhaven::archive {

namespace {

static_assert(std::endian::native == std::endian::little, "the file is little endian");

constexpr std::array<char, 8> kMagic{'L', 'H', 'F', 'R', 'A', 'M', 'E', 'S'};
constexpr std::uint32_t kVersion = 1;
constexpr std::uint32_t kKeyFlag = 1;
constexpr int kMaxSidePixels = 16384;
constexpr std::int64_t kMaxWallMs = 253'402'300'800'000;  // the year 10000

struct RawHeader {
    std::array<char, 8> magic = kMagic;
    std::uint32_t version = kVersion;
    std::uint32_t check = 0;
    std::int64_t start_wall_ms = 0;
    std::int32_t width = 0;
    std::int32_t height = 0;
    std::int32_t reason = 0;
    std::array<char, 8> codec{};
    std::array<char, 8> audio_codec{};
    std::array<std::uint8_t, 11> unused{};
    std::uint8_t finished = 0;  // outside the checksum, since it changes while readers look
};
static_assert(sizeof(RawHeader) == 64 && offsetof(RawHeader, finished) == 63);

struct RawEntry {
    std::uint64_t offset = 0;
    std::uint32_t size = 0;
    std::uint32_t time_ms = 0;
    std::uint32_t flags = 0;
    std::uint32_t check = 0;
};
static_assert(sizeof(RawEntry) == 24);

constexpr off_t kMaxFileBytes = sizeof(RawHeader) + off_t{sizeof(RawEntry)} * kMaxFrameTimeMs;

// FNV-1a by words with extra mixing: any changed word or byte changes it, and it is not 0 for zeros.
std::uint32_t Checksum(const void* data, std::size_t size) {
    const auto* bytes = static_cast<const std::uint8_t*>(data);
    std::uint32_t sum = 2'166'136'261U;
    const auto add = [&](std::uint32_t word) {
        sum = (sum ^ word) * 16'777'619U;
        sum ^= sum >> 15;
    };
    for (; size >= sizeof(std::uint32_t); size -= sizeof(std::uint32_t), bytes += sizeof(std::uint32_t)) {
        std::uint32_t word = 0;
        std::memcpy(&word, bytes, sizeof(word));
        add(word);
    }
    for (; size > 0; --size) {
        add(*bytes++);
    }
    return sum;
}

std::uint32_t CheckOf(const RawEntry& entry) {
    return Checksum(&entry, offsetof(RawEntry, check));
}

std::uint32_t CheckOf(RawHeader header) {
    header.check = 0;
    return Checksum(&header, offsetof(RawHeader, finished));
}

std::array<char, 8> Name(const std::string& text) {
    std::array<char, 8> name{};
    text.copy(name.data(), name.size());
    return name;
}

std::string Text(const std::array<char, 8>& name) {
    return {name.data(), ::strnlen(name.data(), name.size())};
}

void WriteAll(int file, const void* data, std::size_t size, std::uint64_t at, const std::string& path) {
    if (!base::WriteAllAt(file, data, size, at)) {
        base::ThrowErrno("cannot write " + path);
    }
}

// Returns how many bytes were read: fewer than size at the end of the file.
std::size_t ReadUpTo(int file, void* buffer, std::size_t size, std::uint64_t at, const std::string& path) {
    const std::optional<std::size_t> got = base::ReadAllAt(file, buffer, size, at);
    if (!got) {
        base::ThrowErrno("cannot read " + path);
    }
    return *got;
}

struct flock WholeFile(short type) {
    struct flock lock {};
    lock.l_type = type;
    lock.l_whence = SEEK_SET;
    return lock;
}

}  // namespace

bool IsPossible(const IndexHeader& header) {
    const std::optional<base::Codec> video = base::CodecNamed(header.codec);
    const std::optional<base::Codec> audio = base::CodecNamed(header.audio_codec);
    return video && base::IsVideo(*video) && (header.audio_codec.empty() || (audio && !base::IsVideo(*audio))) &&
           header.width > 0 && header.width <= kMaxSidePixels && header.height > 0 && header.height <= kMaxSidePixels &&
           header.start_wall_ms >= 0 && header.start_wall_ms < kMaxWallMs;
}

std::int64_t DurationMs(std::int64_t frame_count, std::int64_t last_time_ms) {
    if (frame_count == 0) {
        return 0;
    }
    constexpr std::int64_t kMaxPeriodMs = 1000;
    const std::int64_t period_ms = frame_count > 1 ? last_time_ms / (frame_count - 1) : kMaxPeriodMs;
    return last_time_ms + std::clamp<std::int64_t>(period_ms, 1, kMaxPeriodMs);
}

FrameIndexWriter::FrameIndexWriter(const std::filesystem::path& path, const IndexHeader& header)
    : path_(path.string()),
      file_(OpenFile(path, O_RDWR | O_CREAT | O_EXCL)) {
    RawHeader raw;
    raw.start_wall_ms = header.start_wall_ms;
    raw.width = header.width;
    raw.height = header.height;
    raw.reason = header.reason;
    raw.codec = Name(header.codec);
    raw.audio_codec = Name(header.audio_codec);
    raw.check = CheckOf(raw);
    try {
        // This kind of lock belongs to the open file, not to the process; some file systems do not support it.
        struct flock lock = WholeFile(F_WRLCK);
        if (::fcntl(file_.Get(), F_OFD_SETLK, &lock) != 0) {
            base::ThrowErrno("cannot lock " + path_);
        }
        WriteAll(file_.Get(), &raw, sizeof(raw), 0, path_);
    } catch (...) {
        RemoveFile(path);
        throw;
    }
    size_bytes_ = sizeof(raw);
}

void FrameIndexWriter::Append(std::span<const FrameEntry> entries) {
    std::vector<RawEntry> raw;
    raw.reserve(entries.size());
    for (const FrameEntry& entry : entries) {
        raw.push_back({entry.offset, entry.size, entry.time_ms, entry.key ? kKeyFlag : 0, 0});
        raw.back().check = CheckOf(raw.back());
    }
    try {
        WriteAll(file_.Get(), raw.data(), raw.size() * sizeof(RawEntry), size_bytes_, path_);
    } catch (...) {
        // Should this fail too, readers ignore the torn entry.
        [[maybe_unused]] const int result = ::ftruncate(file_.Get(), static_cast<off_t>(size_bytes_));
        throw;
    }
    size_bytes_ += raw.size() * sizeof(RawEntry);
}

void FrameIndexWriter::Finish() {
    const std::uint8_t finished = 1;
    WriteAll(file_.Get(), &finished, 1, offsetof(RawHeader, finished), path_);
    if (::fdatasync(file_.Get()) != 0) {
        base::ThrowErrno("cannot write " + path_);
    }
    file_.Reset();
}

FrameIndexReader::FrameIndexReader(const std::filesystem::path& path)
    : FrameIndexReader(OpenFile(path, O_RDONLY), path.string()) {}

FrameIndexReader::FrameIndexReader(base::FileDescriptor file, std::string path)
    : path_(std::move(path)),
      file_(std::move(file)),
      position_bytes_(sizeof(RawHeader)) {
    RawHeader raw;
    const std::size_t size = ReadUpTo(file_.Get(), &raw, sizeof(raw), 0, path_);
    if (size < sizeof(raw)) {
        throw ArchiveError(path_ + (size == 0 ? " is empty" : " is cut short"));
    }
    if (raw.magic != kMagic) {
        throw ArchiveError(path_ + " is not a frame index");
    }
    if (raw.version != kVersion) {
        throw ArchiveError(path_ + " is a frame index of another version");
    }
    header_ = {Text(raw.codec), Text(raw.audio_codec), raw.width, raw.height, raw.start_wall_ms, raw.reason};
    if (raw.check != CheckOf(raw) || raw.finished > 1 || !IsPossible(header_)) {
        throw ArchiveError(path_ + " has a damaged head");
    }
}

void FrameIndexReader::ReadNew(std::uint64_t recording_bytes, std::vector<FrameEntry>& entries) {
    struct stat status {};
    if (::fstat(file_.Get(), &status) != 0 || status.st_size > kMaxFileBytes) {
        throw ArchiveError(path_ + " is larger than any frame index");
    }
    if (entries.empty()) {
        entries.reserve(static_cast<std::size_t>(status.st_size) / sizeof(RawEntry));
    }
    std::vector<RawEntry> block(2048);
    bool torn = false;
    for (std::uint64_t at = position_bytes_;;) {
        const std::size_t got = ReadUpTo(file_.Get(), block.data(), block.size() * sizeof(RawEntry), at, path_);
        for (const RawEntry& raw : std::span(block).first(got / sizeof(RawEntry))) {
            if (raw.check != CheckOf(raw)) {
                torn = true;
                continue;
            }
            const bool usable = raw.size > 0 && raw.size <= base::kMaxFrameBytes &&
                                raw.offset < (std::uint64_t{1} << 62) && raw.offset >= frames_end_ &&
                                raw.time_ms <= kMaxFrameTimeMs && (frames_end_ > 0 || (raw.flags & kKeyFlag) != 0);
            if (torn || !usable) {
                throw ArchiveError(path_ + " is damaged");
            }
            if (raw.offset + raw.size > recording_bytes) {
                return;
            }
            entries.push_back({raw.offset, raw.size, raw.time_ms, (raw.flags & kKeyFlag) != 0});
            frames_end_ = raw.offset + raw.size;
            position_bytes_ += sizeof(RawEntry);
        }
        if (got < block.size() * sizeof(RawEntry)) {
            return;
        }
        at += got;
    }
}

bool FrameIndexReader::IsGrowing() const {
    struct flock lock = WholeFile(F_RDLCK);
    return !IsFinished() && ::fcntl(file_.Get(), F_OFD_GETLK, &lock) == 0 && lock.l_type != F_UNLCK;
}

bool FrameIndexReader::IsFinished() const {
    std::uint8_t finished = 0;
    return ReadUpTo(file_.Get(), &finished, 1, offsetof(RawHeader, finished), path_) == 1 && finished != 0;
}

}  // namespace lookhaven::archive
