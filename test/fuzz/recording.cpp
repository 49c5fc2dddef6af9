// SPDX-License-Identifier: Apache-2.0
//
// Reads two recordings with frames of any times, each by itself while it grows and both as a span: the invariants of
// the reader must hold.
#include "standalone/archive/recording_reader.h"

#include <unistd.h>

#include "standalone/archive/layout.h"
#include "standalone/archive/span_file.h"
#include "test/fuzz/fuzz.h"
#include "test/support/folder.h"

using namespace lookhaven;

namespace {

constexpr std::int64_t kStartMs = 4'000'000'000'000;  // in the future, where no frame is repeated up to now

// Frames in presentation order, with times of their own, found by them.
void Check(const archive::RecordingReader& reader) {
    for (int i = 0; i < reader.FrameCount(); ++i) {
        const std::int64_t time_ms = reader.At(i).time_ms;
        fuzz::Require(i == 0 || time_ms > reader.At(i - 1).time_ms);
        fuzz::Require(reader.TimeOf(i) == time_ms && (time_ms < 0 || reader.IndexAt(time_ms) == i));
        fuzz::Require(reader.At(i).entry < reader.Entries(reader.At(i).segment).size());
    }
    fuzz::Require(reader.FrameCount() == 0 || (reader.FrameRate() >= 1 && reader.FrameRate() <= 1000));
}

std::vector<archive::FrameEntry> TakeFrames(fuzz::Input& input) {
    std::vector<archive::FrameEntry> frames;
    archive::FrameEntry frame{.key = true};
    for (int left = input.Take<std::uint8_t>(); left > 0; --left) {
        frame.offset += frame.size;
        frame.size = input.Take<std::uint8_t>() + 1U;
        frame.time_ms += static_cast<std::uint32_t>(std::int32_t{input.Take<std::int16_t>()});
        frames.push_back(frame);
    }
    return frames;
}

// Writes the frames in two halves and reads what there is after each: what was read once keeps its place.
void WriteAndRead(const std::filesystem::path& path, std::int64_t start_ms,
                  std::span<const archive::FrameEntry> frames) {
    fuzz::WriteFile(path, {});
    fuzz::Require(::truncate(path.c_str(), 1 << 20) == 0);
    std::filesystem::remove(archive::IndexPathOf(path));
    archive::FrameIndexWriter writer(archive::IndexPathOf(path), {"H264", "", 640, 480, start_ms, 1});
    writer.Append(frames.first(frames.size() / 2));
    archive::RecordingReader reader(path);
    Check(reader);
    std::vector<std::int64_t> times;
    for (int i = 0; i < reader.FrameCount(); ++i) {
        times.push_back(reader.TimeOf(i));
    }
    writer.Append(frames.subspan(frames.size() / 2));
    writer.Finish();
    reader.Refresh();
    Check(reader);
    for (std::size_t i = 0; i < times.size(); ++i) {
        fuzz::Require(reader.TimeOf(static_cast<int>(i)) == times[i]);
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const test::TemporaryFolder folder;
    std::filesystem::create_directory(folder / "2096-10-02");
    fuzz::Input input(data, size);
    const std::int64_t begin_ms = kStartMs + input.Take<std::int16_t>();
    const std::int64_t end_ms = begin_ms + input.Take<std::uint16_t>();
    const std::int64_t second_start_ms = kStartMs + input.Take<std::int16_t>();
    try {
        WriteAndRead(folder / "2096-10-02/070640-1.mkv", kStartMs, TakeFrames(input));
        WriteAndRead(folder / "2096-10-02/070640-2.mkv", second_start_ms, TakeFrames(input));
        archive::WriteSpan(folder / "2096-10-02/070640-3.span",
                           {begin_ms, end_ms, {"2096-10-02/070640-1.mkv", "2096-10-02/070640-2.mkv"}});
        Check(archive::RecordingReader(folder / "2096-10-02/070640-3.span"));
    } catch (const archive::ArchiveError&) {
    }
    return 0;
}
