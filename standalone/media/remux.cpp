// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/remux.h"

#include <algorithm>
#include <string>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>

#include "standalone/archive/frame_index.h"
#include "standalone/archive/layout.h"
#include "standalone/archive/mount_file.h"
#include "standalone/archive/span_file.h"
#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/media/libav.h"
#include "standalone/media/matroska_output.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

constexpr std::int64_t kFlushMs = 1000;

// What a copy has beyond the part of the recording that it is taken from, at most: for each frame, for each recording.
constexpr std::int64_t kMaxFrameOverheadBytes = 64;
constexpr std::int64_t kMaxOverheadBytes = 65'536;
// Reading begins in the cluster of the first frame, which began at most a second before it.
constexpr std::int64_t kMaxClusterMs = 2000;

// A void element: its id, then a length of eight bytes whose first one says that.
constexpr std::int64_t kVoidHeadBytes = 9;

// The part of one recording that is copied; times from its own start.
struct Piece {
    std::filesystem::path path;
    archive::IndexHeader header;
    std::int64_t begin_ms = 0;   // of a key frame
    std::int64_t last_ms = 0;    // of the last frame
    std::int64_t max_bytes = 0;  // of the copy
};

std::int64_t MaxBytesOf(const Piece& piece, const std::vector<archive::FrameEntry>& entries) {
    std::uint64_t from = 0;
    std::uint64_t to = 0;
    for (const archive::FrameEntry& entry : entries) {
        from = entry.time_ms + kMaxClusterMs < piece.begin_ms ? std::max(from, entry.offset) : from;
        to = entry.time_ms <= piece.last_ms ? std::max(to, entry.offset + entry.size) : to;
    }
    return static_cast<std::int64_t>(to - std::min(from, to)) + kMaxOverheadBytes +
           kMaxFrameOverheadBytes * static_cast<std::int64_t>(entries.size());
}

// Nothing when the recording has no frame in the period.
std::optional<Piece> PieceOf(const std::filesystem::path& path, std::optional<std::int64_t> begin_wall_ms,
                             std::optional<std::int64_t> end_wall_ms) {
    archive::FrameIndexReader index(archive::IndexPathOf(path));
    std::vector<archive::FrameEntry> entries;
    index.ReadNew(archive::SizeOf(archive::OpenFile(path, O_RDONLY), path), entries);
    const std::int64_t start_ms = index.Header().start_wall_ms;
    const std::int64_t begin_ms = begin_wall_ms.value_or(start_ms) - start_ms;
    Piece piece{path, index.Header(), 0, -1, 0};
    bool has_frame = false;
    for (const archive::FrameEntry& entry : entries) {
        if (entry.key && entry.time_ms <= std::max<std::int64_t>(begin_ms, 0)) {
            piece.begin_ms = entry.time_ms;
        }
        if (!end_wall_ms || start_ms + entry.time_ms < *end_wall_ms) {
            piece.last_ms = std::max<std::int64_t>(piece.last_ms, entry.time_ms);
            has_frame |= entry.time_ms >= begin_ms;
        }
    }
    piece.max_bytes = MaxBytesOf(piece, entries);
    return has_frame ? std::optional(piece) : std::nullopt;
}

void RequireOneFormat(const std::vector<Piece>& pieces) {
    const archive::IndexHeader& first = pieces.front().header;
    for (const Piece& piece : pieces) {
        if (piece.header.codec != first.codec || piece.header.audio_codec != first.audio_codec ||
            piece.header.width != first.width || piece.header.height != first.height) {
            throw SourceError(piece.path.string() + " has another format than the recording before it");
        }
    }
}

std::vector<Piece> PiecesOf(const std::filesystem::path& recording, const ExportOptions& options) {
    std::vector<Piece> pieces;
    if (recording.extension() != ".span") {
        if (auto piece = PieceOf(recording, options.begin_ms, options.end_ms)) {
            pieces.push_back(*std::move(piece));
        }
    } else {
        const archive::Span span = archive::ReadSpan(recording);
        const std::int64_t begin_ms = std::max(options.begin_ms.value_or(span.begin_ms), span.begin_ms);
        const std::int64_t end_ms = std::min(options.end_ms.value_or(span.end_ms), span.end_ms);
        for (const std::string& name : span.recordings) {
            const std::filesystem::path path = recording.parent_path().parent_path() / name;
            if (!std::filesystem::exists(path)) {
                continue;  // deleted by retention
            }
            if (auto piece = PieceOf(path, begin_ms, end_ms)) {
                pieces.push_back(*std::move(piece));
            }
        }
    }
    if (pieces.empty()) {
        throw SourceError(recording.string() + " has no footage of that time");
    }
    RequireOneFormat(pieces);
    return pieces;
}

class Copier {
  public:
    // announced_bytes: of the whole copy; 0: as many as it takes.
    Copier(int descriptor, bool with_sound, std::int64_t announced_bytes)
        : descriptor_(descriptor),
          output_(descriptor, IsFile(descriptor)),
          with_sound_(with_sound),
          announced_bytes_(announced_bytes) {}

    void Add(const Piece& piece) {
        Open(piece);
        const std::int64_t wall_ms = piece.header.start_wall_ms + piece.begin_ms;
        if (!begun_) {
            Begin(wall_ms);
        }
        // Even if the wall clock was set back, the later recording comes after the earlier one.
        offset_ms_ = std::max(wall_ms - start_wall_ms_, last_ms_ + 1) - piece.begin_ms;
        Copy(piece);
    }

    void End() {
        output_.End();
        if (announced_bytes_ > 0) {
            FillUp();
        }
    }

  private:
    static bool IsFile(int descriptor) {
        struct stat status {};
        return ::fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode);
    }

    std::int64_t BytesLeft() const {
        const std::int64_t left = announced_bytes_ - kVoidHeadBytes - output_.BytesWritten();
        if (left < 0) {
            throw SourceError("the copy is longer than announced");
        }
        return left;
    }

    void FillUp() {
        const std::int64_t left = BytesLeft();
        std::vector<std::uint8_t> block(kMaxOverheadBytes);
        block[0] = 0xEC;
        block[1] = 0x01;
        for (std::size_t i = 0; i < 7; ++i) {
            block[8 - i] = static_cast<std::uint8_t>(left >> (8 * i) & 0xFF);
        }
        for (std::int64_t rest = kVoidHeadBytes + left; rest > 0;) {
            const std::int64_t size = std::min<std::int64_t>(rest, kMaxOverheadBytes);
            if (!base::WriteAll(descriptor_, block.data(), static_cast<std::size_t>(size))) {
                base::ThrowErrno("cannot finish a copy");
            }
            std::fill_n(block.begin(), kVoidHeadBytes, std::uint8_t{0});
            rest -= size;
        }
    }

    void Open(const Piece& piece) {
        AvOptions options;
        options.Set("protocol_whitelist", "file").Set("format_whitelist", "matroska,webm");
        AVFormatContext* input = nullptr;
        file_ = archive::OpenFile(piece.path, O_RDONLY);
        const std::string url = "file:/proc/self/fd/" + std::to_string(file_.Get());  // of this file, not of its path
        CheckAv(avformat_open_input(&input, url.c_str(), nullptr, options.Get()), "cannot open " + piece.path.string());
        input_.reset(input);
        video_ = av_find_best_stream(input, AVMEDIA_TYPE_VIDEO, -1, -1, nullptr, 0);
        audio_ = with_sound_ ? av_find_best_stream(input, AVMEDIA_TYPE_AUDIO, -1, -1, nullptr, 0) : -1;
        CheckAv(video_, piece.path.string() + " has no picture");
    }

    void Begin(std::int64_t wall_ms) {
        begun_ = true;
        start_wall_ms_ = wall_ms;
        to_video_ = output_.AddStream(*input_->streams[video_]->codecpar);
        to_audio_ = audio_ < 0 ? -1 : output_.AddStream(*input_->streams[audio_]->codecpar);
        output_.SetStart(wall_ms);
        output_.Begin();
    }

    void Copy(const Piece& piece) {
        if (piece.begin_ms > 0) {
            const AVRational unit = input_->streams[video_]->time_base;
            av_seek_frame(input_.get(), video_, av_rescale_q(piece.begin_ms, {1, 1000}, unit), AVSEEK_FLAG_BACKWARD);
        }
        std::int64_t reached_ms = -1;
        while (reached_ms < piece.last_ms) {
            av_packet_unref(packet_.get());
            // A growing recording may end inside a frame, but only after the last frame in its index.
            CheckAv(av_read_frame(input_.get(), packet_.get()), "cannot read on in " + piece.path.string());
            const bool is_video = packet_->stream_index == video_;
            if ((!is_video && packet_->stream_index != audio_) || packet_->pts == AV_NOPTS_VALUE) {
                continue;
            }
            const AVRational unit = input_->streams[packet_->stream_index]->time_base;
            const std::int64_t time_ms = av_rescale_q(packet_->pts, unit, {1, 1000});
            if (time_ms >= piece.begin_ms && time_ms <= piece.last_ms) {
                Write(is_video ? to_video_ : to_audio_, offset_ms_ + time_ms);
            }
            reached_ms = is_video ? std::max(reached_ms, time_ms) : reached_ms;
        }
    }

    void Write(int stream, std::int64_t time_ms) {
        output_.Write(stream, {packet_->data, static_cast<std::size_t>(packet_->size)}, time_ms,
                      (packet_->flags & AV_PKT_FLAG_KEY) != 0);
        last_ms_ = std::max(last_ms_, time_ms);
        if (last_ms_ - flushed_ms_ >= kFlushMs) {
            flushed_ms_ = last_ms_;
            output_.Flush();
            if (announced_bytes_ > 0) {
                BytesLeft();
            }
        }
    }

    int descriptor_;
    MatroskaOutput output_;
    bool with_sound_;
    std::int64_t announced_bytes_;
    bool begun_ = false;
    std::int64_t start_wall_ms_ = 0;
    std::int64_t offset_ms_ = 0;
    std::int64_t last_ms_ = -1;
    std::int64_t flushed_ms_ = 0;
    base::FileDescriptor file_;
    AvPtr<AVFormatContext> input_;
    AvPtr<AVPacket> packet_ = OwnAv(av_packet_alloc());
    int video_ = -1;
    int audio_ = -1;
    int to_video_ = -1;
    int to_audio_ = -1;
};

}  // namespace

void Export(const std::filesystem::path& recording, int output, const ExportOptions& options) {
    const std::vector<Piece> pieces = PiecesOf(recording, options);
    std::int64_t announced_bytes = 0;
    if (options.announce) {
        for (const Piece& piece : pieces) {
            announced_bytes += piece.max_bytes;
        }
        options.announce(announced_bytes);
    }
    Copier copier(output, options.with_sound, announced_bytes);
    for (const Piece& piece : pieces) {
        copier.Add(piece);
    }
    copier.End();
}

}  // namespace lookhaven::media
