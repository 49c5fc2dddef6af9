// SPDX-License-Identifier: Apache-2.0
#include "test/support/footage/clips.h"

#include <array>
#include <cstdio>
#include <map>
#include <memory>
#include <stop_token>

#include "standalone/archive/recording_reader.h"
#include "standalone/media/demuxer.h"
#include "test/support/footage/archive_folder.h"

namespace lookhaven::test {

std::string Shell(const std::string& command) {
    const std::unique_ptr<FILE, int (*)(FILE*)> pipe(::popen(("{ " + command + "; } 2>&1").c_str(), "r"), ::pclose);
    std::string text;
    std::array<char, 4096> block{};
    while (const std::size_t got = ::fread(block.data(), 1, block.size(), pipe.get())) {
        text.append(block.data(), got);
    }
    return text;
}

media::Packet Clip::At(std::size_t number) const {
    const OwnedPacket& packet = packets.at(number);
    const bool is_video = packet.medium == base::Medium::kVideo;
    return {packet.medium, packet.data, packet.time_us, packet.key_frame, is_video ? &format.video : &*format.audio};
}

std::vector<std::vector<std::uint8_t>> Clip::Frames() const {
    std::vector<std::vector<std::uint8_t>> frames;
    for (const OwnedPacket& packet : packets) {
        if (packet.medium == base::Medium::kVideo) {
            frames.push_back(packet.data);
        }
    }
    return frames;
}

const Clip& MakeClip(const std::string& video_options, const std::string& audio_options) {
    static std::map<std::string, Clip> clips;
    const auto [at, is_new] = clips.try_emplace(video_options + audio_options);
    if (!is_new) {
        return at->second;
    }
    Clip& clip = at->second;
    const ArchiveFolder folder;
    const std::string path = folder / "clip.mkv";
    const std::string sound = audio_options.empty() ? "" : " -f lavfi -i sine=r=8000 " + audio_options;
    Shell("ffmpeg -v error -f lavfi -i testsrc2=s=160x120:r=25" + sound + " -t 4 " + video_options + " " + path);
    media::Deadline deadline({}, std::chrono::seconds(60));
    media::AvOptions options;
    media::Demuxer demuxer("file:" + path, options, deadline, media::Demuxer::Framing::kWhole);
    while (const auto packet = demuxer.Read()) {
        clip.packets.push_back(
            {{packet->data.begin(), packet->data.end()}, packet->medium, packet->timestamp_us, packet->key_frame});
        if (packet->medium == base::Medium::kVideo) {
            clip.format.video = *packet->format;
        }
    }
    clip.format.audio = demuxer.Audio();
    return clip;
}

void Record(const Clip& clip, const std::filesystem::path& path, bool close, std::size_t count,
            std::int64_t start_wall_ms) {
    std::filesystem::create_directories(path.parent_path());
    media::RecordingWriter writer(path, clip.format, start_wall_ms, 1);
    for (std::size_t i = 0; i < std::min(count, clip.packets.size()); ++i) {
        writer.Write(clip.At(i));
        if (i % 20 == 19) {
            writer.Flush();
        }
    }
    if (close) {
        writer.Close();
    } else {
        writer.Flush();
    }
}

std::vector<archive::FrameEntry> Entries(const std::filesystem::path& recording) {
    const archive::RecordingReader opened(recording);
    const auto entries = opened.Entries(0);
    return {entries.begin(), entries.end()};
}

std::string Probe(const std::filesystem::path& path) {
    return Shell("ffprobe -v error -count_frames -show_entries stream=codec_name,nb_read_frames -of csv=p=0 " +
                 path.string());
}

}  // namespace lookhaven::test
