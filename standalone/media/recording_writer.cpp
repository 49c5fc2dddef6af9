// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/recording_writer.h"

#include <algorithm>
#include <string>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

#include "standalone/archive/frame_index.h"
#include "standalone/archive/layout.h"
#include "standalone/archive/matroska_blocks.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/log.h"
#include "standalone/media/annexb.h"
#include "standalone/media/matroska_output.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

constexpr std::int64_t kFlushUs = 500'000;
constexpr std::int64_t kMaxRecordingUs = std::int64_t{archive::kMaxRecordingSeconds} * 1'000'000;

bool IsSamePicture(const StreamFormat& one, const StreamFormat& other) {
    return one.codec == other.codec && one.width == other.width && one.height == other.height;
}

archive::IndexHeader HeaderOf(const RecordingFormat& format, std::int64_t start_wall_ms, int reason) {
    return {CodecName(format.video.codec),
            format.audio ? CodecName(format.audio->codec) : "",
            format.video.width,
            format.video.height,
            start_wall_ms,
            reason};
}

// Runs a step of writing; what the disk reports comes out as a WriteError.
template <class Step>
void OnDisk(Step step) {
    try {
        step();
    } catch (const WriteError&) {
        throw;
    } catch (const std::system_error& error) {
        throw WriteError(error.code(), error.what());
    } catch (const SourceError& error) {
        throw WriteError(std::make_error_code(std::errc::invalid_argument), error.what());
    } catch (const archive::ArchiveError& error) {
        throw WriteError(std::make_error_code(std::errc::io_error), error.what());
    }
}

// A file that is removed again unless it is kept.
class NewFile {
  public:
    explicit NewFile(const std::filesystem::path& path)
        : path_(path),
          file_(base::OpenFile(path, O_RDWR | O_CREAT | O_EXCL, 0640)) {}
    NewFile(const NewFile&) = delete;
    NewFile& operator=(const NewFile&) = delete;
    ~NewFile() {
        if (!kept_) {
            ::unlink(path_.c_str());
        }
    }

    int Get() const { return file_.Get(); }
    void Keep() { kept_ = true; }

  private:
    std::filesystem::path path_;
    base::FileDescriptor file_;
    bool kept_ = false;
};

}  // namespace

class RecordingWriter::File {
  public:
    File(const std::filesystem::path& path, const RecordingFormat& format, std::int64_t start_wall_ms, int reason)
        : path_(path.string()),
          format_(format),
          start_wall_ms_(start_wall_ms),
          file_(path),
          output_(file_.Get(), true),
          video_(output_.AddStream(format.video)),
          audio_(format.audio ? output_.AddStream(*format.audio) : -1),
          blocks_((Begin(), file_.Get())),
          index_(archive::IndexPathOf(path), HeaderOf(format, start_wall_ms, reason)),
          flushed_us_(base::MonotonicMicros()) {
        file_.Keep();
    }

    bool Takes(const Packet& packet) const {
        if (begin_us_ && packet.timestamp_us - *begin_us_ >= kMaxRecordingUs) {
            return false;
        }
        return packet.medium == Medium::kVideo ? IsSamePicture(*packet.format, format_.video)
                                               : format_.audio && *packet.format == *format_.audio;
    }

    void Write(const Packet& packet) {
        const bool is_video = packet.medium == Medium::kVideo;
        if (!begin_us_) {
            if (!is_video || !packet.key_frame) {
                return;
            }
            begin_us_ = packet.timestamp_us;
        }
        const std::int64_t time_ms = (packet.timestamp_us - *begin_us_) / 1000;
        if (packet.timestamp_us >= *begin_us_ || is_video) {
            Guarded([&] {
                output_.Write(is_video ? video_ : audio_, packet.data, std::max<std::int64_t>(time_ms, 0),
                              packet.key_frame);
            });
            is_pending_ = true;
        }
        if (base::MonotonicMicros() - flushed_us_ >= kFlushUs) {
            Flush();
        }
    }

    void Flush() {
        flushed_us_ = base::MonotonicMicros();
        if (std::exchange(is_pending_, false)) {
            Guarded([&] {
                output_.Flush();
                Sync();
                std::vector<archive::FrameEntry> frames;
                while (blocks_.ReadCluster(frames)) {
                }
                index_.Append(frames);
                Count(frames);
            });
        }
    }

    void Close() {
        if (!failed_) {
            Flush();
            try {
                output_.End();
                Sync();
                end_bytes_ = static_cast<std::uint64_t>(::lseek(file_.Get(), 0, SEEK_END));
            } catch (const std::exception& error) {
                base::LogWarning(path_ + " ends without a seek table: " + error.what());
                failed_ = true;
            }
        }
        OnDisk([&] {
            if (failed_ && ::ftruncate(file_.Get(), static_cast<off_t>(end_bytes_)) != 0) {
                base::ThrowErrno("cannot cut " + path_);
            }
            index_.Finish();
        });
    }

    int FrameCount() const { return frame_count_; }
    std::uint64_t SizeBytes() const { return end_bytes_ + index_.SizeBytes(); }
    std::int64_t EndWallMs() const { return start_wall_ms_ + archive::DurationMs(frame_count_, latest_ms_); }

  private:
    // Only then does the file have a head to be read.
    void Begin() {
        output_.SetStart(start_wall_ms_);
        output_.Begin();
    }

    template <class Step>
    void Guarded(Step step) {
        try {
            OnDisk(step);
        } catch (...) {
            failed_ = true;
            throw;
        }
    }

    void Sync() const {
        if (::fdatasync(file_.Get()) != 0) {
            base::ThrowErrno("cannot write " + path_);
        }
    }

    void Count(const std::vector<archive::FrameEntry>& frames) {
        frame_count_ += static_cast<int>(frames.size());
        for (const archive::FrameEntry& frame : frames) {
            latest_ms_ = std::max<std::int64_t>(latest_ms_, frame.time_ms);
        }
        end_bytes_ = blocks_.Position();
    }

    std::string path_;
    RecordingFormat format_;
    std::int64_t start_wall_ms_;
    NewFile file_;
    MatroskaOutput output_;
    int video_;
    int audio_;
    archive::MatroskaBlocks blocks_;
    archive::FrameIndexWriter index_;
    std::optional<std::int64_t> begin_us_;  // the capture of the first key frame
    std::int64_t flushed_us_;
    bool is_pending_ = false;
    bool failed_ = false;
    int frame_count_ = 0;
    std::int64_t latest_ms_ = 0;
    std::uint64_t end_bytes_ = blocks_.Position();  // of what is whole
};

RecordingWriter::RecordingWriter(const std::filesystem::path& path, const RecordingFormat& format,
                                 std::int64_t start_wall_ms, int reason) {
    try {
        file_ = std::make_unique<File>(path, format, start_wall_ms, reason);
    } catch (const std::system_error& error) {
        throw WriteError(error.code(), error.what());
    }
}

RecordingWriter::~RecordingWriter() = default;

bool RecordingWriter::Takes(const Packet& packet) const {
    return file_->Takes(packet);
}
void RecordingWriter::Write(const Packet& packet) {
    file_->Write(packet);
}
void RecordingWriter::Flush() {
    file_->Flush();
}
void RecordingWriter::Close() {
    file_->Close();
}
int RecordingWriter::FrameCount() const {
    return file_->FrameCount();
}
std::uint64_t RecordingWriter::SizeBytes() const {
    return file_->SizeBytes();
}
std::int64_t RecordingWriter::EndWallMs() const {
    return file_->EndWallMs();
}

}  // namespace lookhaven::media
