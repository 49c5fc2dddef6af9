// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/remux.h"

#include <algorithm>
#include <string>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>

#include "standalone/archive/file.h"
#include "standalone/archive/frame_index.h"
#include "standalone/archive/layout.h"
#include "standalone/archive/span_file.h"
#include "standalone/media/libav.h"
#include "standalone/media/matroska_output.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

constexpr std::int64_t kFlushMs = 1000;

// The part of one recording that is copied; times from its own start.
struct Piece {
    std::filesystem::path path;
    archive::IndexHeader header;
    std::int64_t begin_ms = 0;  // of a key frame
    std::int64_t last_ms = 0;   // of the last frame
};

// Nothing when the recording has no frame in the period.
std::optional<Piece> PieceOf(const std::filesystem::path& path, std::optional<std::int64_t> begin_wall_ms,
                             std::optional<std::int64_t> end_wall_ms) {
    archive::FrameIndexReader index(archive::IndexPathOf(path));
    std::vector<archive::FrameEntry> entries;
    index.ReadNew(archive::SizeOf(archive::OpenFile(path, O_RDONLY), path), entries);
    const std::int64_t start_ms = index.Header().start_wall_ms;
    const std::int64_t begin_ms = begin_wall_ms.value_or(start_ms) - start_ms;
    Piece piece{path, index.Header(), 0, -1};
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
    return has_frame ? std::optional(piece) : std::nullopt;
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
    return pieces;
}

class Copier {
  public:
    Copier(int descriptor, bool with_sound) : output_(descriptor, IsFile(descriptor)), with_sound_(with_sound) {}

    void Add(const Piece& piece) {
        Open(piece);
        const std::int64_t wall_ms = piece.header.start_wall_ms + piece.begin_ms;
        if (!begun_) {
            Begin(piece, wall_ms);
        } else if (piece.header.codec != first_.codec || piece.header.audio_codec != first_.audio_codec ||
                   piece.header.width != first_.width || piece.header.height != first_.height) {
            throw SourceError(piece.path.string() + " has another format than the recording before it");
        }
        // Even if the wall clock was set back, the later recording comes after the earlier one.
        offset_ms_ = std::max(wall_ms - start_wall_ms_, last_ms_ + 1) - piece.begin_ms;
        Copy(piece);
    }

    void End() { output_.End(); }

  private:
    static bool IsFile(int descriptor) {
        struct stat status {};
        return ::fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode);
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

    void Begin(const Piece& piece, std::int64_t wall_ms) {
        begun_ = true;
        first_ = piece.header;
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
        }
    }

    MatroskaOutput output_;
    bool with_sound_;
    bool begun_ = false;
    archive::IndexHeader first_;
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
    Copier copier(output, options.with_sound);
    for (const Piece& piece : pieces) {
        copier.Add(piece);
    }
    copier.End();
}

}  // namespace lookhaven::media
