// SPDX-License-Identifier: Apache-2.0
//
// Streams a recording of any bytes, by the index that fits to it or one of any frames: nothing is made up, and it ends.
#include "standalone/media/recorded_media.h"

#include "standalone/archive/layout.h"
#include "standalone/archive/matroska_blocks.h"
#include "standalone/base/video.h"
#include "test/fuzz/fuzz.h"
#include "test/support/folder.h"

using namespace lookhaven;

namespace {

std::vector<archive::FrameEntry> TakeFrames(fuzz::Input& input, int count) {
    std::vector<archive::FrameEntry> frames;
    archive::FrameEntry frame{.key = true};
    for (; count > 0; --count) {
        frame.offset += frame.size + input.Take<std::uint16_t>();
        frame.size = input.Take<std::uint8_t>() + 1U;
        frame.time_ms += input.Take<std::uint8_t>();
        frames.push_back(frame);
        frame.key = input.Take<std::uint8_t>() % 4 == 0;
    }
    return frames;
}

void WriteIndex(const std::filesystem::path& path, const std::string& codec,
                const std::vector<archive::FrameEntry>& frames) {
    std::filesystem::remove(archive::IndexPathOf(path));
    archive::FrameIndexWriter writer(archive::IndexPathOf(path), {codec, "", 640, 480, 1'000'000, 1});
    writer.Append(frames);
    writer.Finish();
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const test::TemporaryFolder folder;
    const std::filesystem::path path = folder / "1.mkv";
    fuzz::Input input(data, size);
    const std::string codec = input.Take<std::uint8_t>() % 2 == 0 ? "H264" : "H265";
    const int own_frames = input.Take<std::uint8_t>();
    std::vector<archive::FrameEntry> frames = TakeFrames(input, own_frames);
    fuzz::WriteFile(path, input.Rest());
    try {
        if (own_frames == 0) {
            const base::FileDescriptor file = base::OpenFile(path, O_RDONLY);
            archive::MatroskaBlocks blocks(file.Get());
            while (blocks.ReadCluster(frames)) {
            }
        }
        WriteIndex(path, codec, frames);
        const archive::RecordingReader recording(path);
        if (recording.FrameCount() == 0) {
            return 0;
        }
        media::RecordedMedia media(recording, recording.FrameCount() / 2, true);
        std::size_t sound_bytes = 0;
        for (std::size_t video = 0; const auto packet = media.Next();) {
            fuzz::Require(!packet->data.empty() || packet->medium == base::Medium::kVideo);
            sound_bytes += packet->medium == base::Medium::kAudio ? packet->data.size() : 0;
            video += packet->medium == base::Medium::kVideo ? 1 : 0;
            fuzz::Require(video <= frames.size() && sound_bytes <= size);
        }
    } catch (const archive::ArchiveError&) {
    }
    return 0;
}
