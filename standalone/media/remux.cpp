// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/remux.h"

#include <algorithm>
#include <cerrno>
#include <string>
#include <system_error>
#include <vector>

#include <sys/stat.h>

#include "standalone/archive/span_file.h"
#include "standalone/base/file.h"
#include "standalone/base/io.h"
#include "standalone/media/join.h"
#include "standalone/media/joiner.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

constexpr std::int64_t kBlockBytes = 65'536;
// The heads of elements that hold nothing, void in Matroska and free in MP4, with a length of eight bytes.
constexpr std::int64_t kVoidHeadBytes = 9;
constexpr std::int64_t kFreeHeadBytes = 16;

void RequireOneFormat(std::span<const archive::RecordingPart> parts) {
    const archive::IndexHeader& first = parts.front().header;
    for (const archive::RecordingPart& part : parts) {
        if (part.header.codec != first.codec || part.header.audio_codec != first.audio_codec ||
            part.header.width != first.width || part.header.height != first.height) {
            throw SourceError(part.path.string() + " has another format than the recording before it");
        }
    }
}

std::vector<archive::RecordingPart> PartsOf(const std::filesystem::path& recording, const ExportOptions& options) {
    std::vector<archive::RecordingPart> parts;
    if (recording.extension() != ".span") {
        if (auto part = archive::PartOf(recording, options.begin_ms, options.end_ms)) {
            parts.push_back(*std::move(part));
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
            if (auto part = archive::PartOf(path, begin_ms, end_ms)) {
                parts.push_back(*std::move(part));
            }
        }
    }
    if (parts.empty()) {
        throw SourceError(recording.string() + " has no footage of that time");
    }
    RequireOneFormat(parts);
    return parts;
}

bool IsFile(int descriptor) {
    struct stat status {};
    return ::fstat(descriptor, &status) == 0 && S_ISREG(status.st_mode);
}

void Send(const ByteSink& sink, std::span<const std::uint8_t> bytes) {
    if (!sink(bytes)) {
        base::ThrowErrno("cannot finish a copy");
    }
}

// Sends the head of an element that holds nothing, with its length in the last eight bytes, and that many zeros.
void SendEmptyElement(const ByteSink& sink, std::vector<std::uint8_t> head, std::uint64_t length, std::int64_t zeros) {
    for (std::size_t i = 0; i < 8; ++i) {
        head[head.size() - 1 - i] |= static_cast<std::uint8_t>(length >> (8 * i) & 0xFF);
    }
    Send(sink, head);
    const std::vector<std::uint8_t> block(kBlockBytes);
    for (std::int64_t left = zeros; left > 0; left -= kBlockBytes) {
        Send(sink, std::span(block).first(static_cast<std::size_t>(std::min(left, kBlockBytes))));
    }
}

// Sends a stream of exactly the announced size.
class SizedStream {
  public:
    SizedStream(const ByteSink& sink, Container container, std::int64_t size_bytes)
        : sink_(sink),
          container_(container),
          size_bytes_(size_bytes),
          output_([this](std::span<const std::uint8_t> bytes) { return Take(bytes); }, container) {}

    ContainerOutput& Output() { return output_; }

    // Throws SourceError when the stream becomes longer than announced.
    void CheckSize() const { BytesLeft(); }

    // Readers look for the table at an MP4's end, so there the filling precedes it.
    void End() {
        output_.Flush();
        if (container_ == Container::kMp4) {
            is_held_ = true;
        }
        output_.End();
        const std::int64_t left = BytesLeft();
        if (container_ == Container::kMp4) {
            SendEmptyElement(sink_, {0, 0, 0, 1, 'f', 'r', 'e', 'e', 0, 0, 0, 0, 0, 0, 0, 0},
                             static_cast<std::uint64_t>(kFreeHeadBytes + left), left);
            Send(sink_, held_);
        } else {
            SendEmptyElement(sink_, {0xEC, 0x01, 0, 0, 0, 0, 0, 0, 0}, static_cast<std::uint64_t>(left), left);
        }
    }

  private:
    bool Take(std::span<const std::uint8_t> bytes) {
        if (!is_held_) {
            return sink_(bytes);
        }
        held_.resize(held_.size() + bytes.size());
        std::ranges::copy(bytes, held_.end() - std::ssize(bytes));
        return true;
    }

    std::int64_t BytesLeft() const {
        const std::int64_t head = container_ == Container::kMp4 ? kFreeHeadBytes : kVoidHeadBytes;
        const std::int64_t left = size_bytes_ - head - output_.BytesWritten();
        if (left < 0) {
            throw SourceError("the copy is longer than announced");
        }
        return left;
    }

    const ByteSink& sink_;
    Container container_;
    std::int64_t size_bytes_;
    bool is_held_ = false;
    std::vector<std::uint8_t> held_;  // what follows the filling
    ContainerOutput output_;
};

}  // namespace

bool Join(std::span<const archive::RecordingPart> parts, const JoinOptions& options, const ByteSink& sink) {
    SizedStream stream(sink, options.container, options.size_bytes);
    Joiner joiner(stream.Output(), options.container, options.with_sound, [&] { stream.CheckSize(); });
    for (const archive::RecordingPart& part : parts) {
        try {
            joiner.Add(part);
        } catch (const UnreadablePart& error) {
            if (!options.on_unreadable) {
                throw;
            }
            options.on_unreadable(part, error.FromWallMs(), error.what());
        }
    }
    if (!joiner.HasBegun()) {
        return false;
    }
    joiner.Finish();
    stream.End();
    return true;
}

void Export(const std::filesystem::path& recording, int output, const ExportOptions& options) {
    const std::vector<archive::RecordingPart> parts = PartsOf(recording, options);
    if (!options.announce) {
        ContainerOutput file(output, IsFile(output));
        Joiner joiner(file, Container::kMatroska, options.with_sound);
        for (const archive::RecordingPart& part : parts) {
            joiner.Add(part);
        }
        joiner.Finish();
        file.End();
        return;
    }
    JoinOptions join{.with_sound = options.with_sound};
    for (const archive::RecordingPart& part : parts) {
        join.size_bytes += MaxJoinedBytes(part, Container::kMatroska);
    }
    options.announce(join.size_bytes);
    Join(parts, join, [output](auto bytes) { return base::WriteAll(output, bytes.data(), bytes.size()); });
}

}  // namespace lookhaven::media
