// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/recording_writer.h"

#include <algorithm>
#include <cerrno>
#include <utility>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/mount_file.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/log.h"
#include "standalone/media/annexb.h"
#include "standalone/media/container_output.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

constexpr std::int64_t kFlushUs = 500'000;
constexpr std::int64_t kMaxRecordingUs = base::kMaxRecordingSeconds * 1'000'000;

bool IsSamePicture(const StreamFormat& one, const StreamFormat& other) {
    return one.codec == other.codec && one.width == other.width && one.height == other.height;
}

archive::IndexHeader HeaderOf(const MediaFormat& format, std::int64_t start_wall_ms, int reason) {
    return {base::CodecName(format.video.codec),
            format.audio ? base::CodecName(format.audio->codec) : "",
            format.video.width,
            format.video.height,
            start_wall_ms,
            reason};
}

// Whether the file was deleted. While its disk is not mounted, the path leads to another file system.
bool IsGone(const std::filesystem::path& path, dev_t device) {
    struct stat status {};
    return ::stat(path.c_str(), &status) != 0 && errno == ENOENT && ::stat(path.parent_path().c_str(), &status) == 0 &&
           status.st_dev == device;
}

// Runs a step of writing and turns what it throws into a WriteError.
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

}  // namespace

RecordingWriter::RecordingWriter(const std::filesystem::path& path, const MediaFormat& format,
                                 std::int64_t start_wall_ms, int reason)
    : path_(path.string()),
      format_(format),
      start_wall_ms_(start_wall_ms),
      flushed_us_(base::MonotonicMicros()) {
    try {
        file_ = archive::OpenFile(path, O_RDWR | O_CREAT | O_EXCL);
        try {
            Create(path, reason);
        } catch (...) {
            archive::RemoveFile(path);
            throw;
        }
    } catch (const std::system_error& error) {
        throw WriteError(error.code(), error.what());
    }
}

RecordingWriter::~RecordingWriter() = default;

void RecordingWriter::Create(const std::filesystem::path& path, int reason) {
    output_ = std::make_unique<ContainerOutput>(file_.Get(), true);
    video_ = output_->AddStream(format_.video);
    audio_ = format_.audio ? output_->AddStream(*format_.audio) : -1;
    output_->SetStart(start_wall_ms_);
    output_->Begin();
    blocks_.emplace(file_.Get());
    end_bytes_ = blocks_->Position();
    index_.emplace(archive::IndexPathOf(path), HeaderOf(format_, start_wall_ms_, reason));
}

bool RecordingWriter::Takes(const Packet& packet) const {
    if (begin_us_ && packet.timestamp_us - *begin_us_ >= kMaxRecordingUs) {
        return false;
    }
    return packet.medium == Medium::kVideo ? IsSamePicture(*packet.format, format_.video)
                                           : format_.audio && *packet.format == *format_.audio;
}

void RecordingWriter::Write(const Packet& packet) {
    const bool is_video = packet.medium == Medium::kVideo;
    if (!begin_us_) {
        if (!is_video || !packet.key_frame) {
            return;
        }
        begin_us_ = packet.timestamp_us;
    }
    const std::int64_t time_ms = (packet.timestamp_us - *begin_us_) / 1000;
    if (packet.timestamp_us >= *begin_us_ || is_video) {
        WriteOrFail([&] {
            output_->Write(is_video ? video_ : audio_, packet.data, std::max<std::int64_t>(time_ms, 0),
                           packet.key_frame);
        });
        is_pending_ = true;
    }
    if (base::MonotonicMicros() - flushed_us_ >= kFlushUs) {
        Flush();
    }
}

void RecordingWriter::Flush() {
    flushed_us_ = base::MonotonicMicros();
    if (std::exchange(is_pending_, false)) {
        WriteOrFail([&] {
            output_->Flush();
            Sync();
            AppendToIndex();
        });
    }
}

void RecordingWriter::Close() {
    if (is_finished_) {
        return;
    }
    if (!has_failed_ && output_ != nullptr) {
        End();
    }
    if (has_failed_ && !std::exchange(is_index_final_, true)) {
        IndexWholeClusters();
    }
    OnDisk([&] {
        if (frame_count_ == 0) {
            Remove();
            return;
        }
        if (has_failed_ && ::ftruncate(file_.Get(), static_cast<off_t>(end_bytes_)) != 0) {
            base::ThrowErrno("cannot truncate " + path_);
        }
        index_->Finish();
    });
    is_finished_ = true;
}

void RecordingWriter::End() {
    try {
        Flush();
    } catch (const WriteError& error) {
        base::LogWarning(path_ + " ends early: " + error.what());
        return;
    }
    try {
        output_->End();
        Sync();
        end_bytes_ = static_cast<std::uint64_t>(::lseek(file_.Get(), 0, SEEK_END));
    } catch (const std::exception& error) {
        base::LogWarning(path_ + " ends without a seek table: " + error.what());
        has_failed_ = true;
    }
    output_.reset();  // it cannot be ended twice
}

// Clusters may have come to the disk whole before it was full.
void RecordingWriter::IndexWholeClusters() {
    try {
        Sync();
        AppendToIndex();
    } catch (const std::exception&) {
        return;  // they are cut off
    }
}

void RecordingWriter::Remove() const {
    struct stat file {};
    if (::fstat(file_.Get(), &file) != 0) {
        base::ThrowErrno("cannot look at " + path_);
    }
    for (const std::filesystem::path& path : {archive::IndexPathOf(path_), std::filesystem::path(path_)}) {
        archive::RemoveFile(path);
        if (!IsGone(path, file.st_dev)) {
            throw std::system_error(EIO, std::generic_category(), "cannot remove " + path.string());
        }
    }
}

template <class Step>
void RecordingWriter::WriteOrFail(Step step) {
    try {
        OnDisk(step);
    } catch (...) {
        has_failed_ = true;
        throw;
    }
}

void RecordingWriter::Sync() {
    if (::fdatasync(file_.Get()) != 0) {
        is_index_final_ = true;  // the next call would succeed, whatever became of the frames
        base::ThrowErrno("cannot write " + path_);
    }
}

void RecordingWriter::AppendToIndex() {
    while (blocks_->ReadCluster(unindexed_)) {
    }
    index_->Append(unindexed_);
    frame_count_ += static_cast<int>(unindexed_.size());
    for (const archive::FrameEntry& frame : unindexed_) {
        latest_ms_ = std::max<std::int64_t>(latest_ms_, frame.time_ms);
    }
    unindexed_.clear();
    end_bytes_ = blocks_->Position();
}

}  // namespace lookhaven::media
