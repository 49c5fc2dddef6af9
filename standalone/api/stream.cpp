// SPDX-License-Identifier: Apache-2.0
//
// Why so        Pictures of H.264 are decoded and encoded again, for each viewer. What a browser can decode by itself
//               is sent as it is: a few reads from the file, without libav. It is one of the session's players, so it
//               is counted, replaced and stopped as those of the module are; but a client that seeks, pauses or
//               changes the rate opens another stream, so of the signals it takes only those that end it.
// Invariants    (1) No part is sent more than kLead before the time of the frame before it: little is wasted when the
//                   client seeks, and it knows in time for how long a picture stays.
//               (2) A stream that is ended early ends without the last boundary.
#include "standalone/api/stream.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <csignal>
#include <cstdint>
#include <cstdio>
#include <limits>
#include <optional>
#include <string_view>
#include <system_error>
#include <thread>

#include "standalone/api/decoder_sandbox.h"
#include "standalone/api/footage.h"
#include "standalone/api/player.h"
#include "standalone/base/log.h"
#include "standalone/base/text.h"
#include "standalone/binding/rights.h"
#include "standalone/control/player_file.h"
#include "standalone/media/recorded_media.h"
#include "standalone/ring/stream.h"

namespace lookhaven::api {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::seconds kLead{2};
constexpr std::chrono::milliseconds kPoll{50};
constexpr std::chrono::milliseconds kTailPoll{100};
constexpr std::int64_t kSlowestStreamRate = -8;
constexpr std::int64_t kFastestStreamRate = 4;

// As a multiple of real time.
double SpeedOf(const Call& call) {
    const std::int64_t rate = call.NumberOr("rate", 1);
    if (rate < kSlowestStreamRate || rate > kFastestStreamRate || (rate > -2 && rate < 1)) {
        throw Failure(400, "rate must be from -8 to -2 or from 1 to 4");
    }
    return rate < 0 ? -1.0 / static_cast<double>(rate) : static_cast<double>(rate);
}

std::int64_t KeyOf(const Call& call) {
    const std::int64_t key = call.NumberOr("timestamp", 0);
    if (key < 1) {
        throw Failure(400, "timestamp must be a number for this player, 1 or more");
    }
    return key;
}

Failure NotStreamed(const std::string& codec) {
    return Failure(406, "footage in " + codec + " is not streamed to this client: play its pictures");
}

void RequireStreamed(const Call& call, const std::string& codec) {
    const Json::Value& asked = call.Parameter("codecs");
    const std::string named = "," + (asked.isNull() ? "H264" : asked.asString()) + ",";
    const bool is_streamed =
        codec == base::CodecName(base::Codec::kH264) || codec == base::CodecName(base::Codec::kH265);
    if (!is_streamed || named.find("," + codec + ",") == named.npos) {
        throw NotStreamed(codec);
    }
}

// From here on the host counts the process, and may end it.
void BecomePlayer(const Call& call, std::int64_t key, int max_players) {
    control::Player& player = call.slot.player;
    player.takes_rate = player.tells_position = player.can_pause = false;
    player.max_players = max_players;
    player.key = key;
    // The host repeats it to interrupt a write to a client that takes nothing; SIGTERM ends the process as it stands.
    struct sigaction action {};
    action.sa_handler = [](int) {};
    ::sigaction(SIGUSR1, &action, nullptr);
    control::WritePlayerFile(call.context.Session());
    call.context.NotePlayer(key);
    const base::Installation& installation = call.context.Installation();
    EnterPlaybackSandbox(installation, PlaybackFilter(installation.StoreUrl()));
}

// Writes parts: each has its boundary in front, so that the last one can be followed by the end.
class Parts {
  public:
    explicit Parts(const Call& call) : output_(*call.context.output()) {}

    bool Begin() {
        return Send("Content-Type: multipart/x-mixed-replace; boundary=" + output_.Boundary() +
                    "\r\nCache-Control: no-store\r\nX-Accel-Buffering: no\r\n\r\n");
    }

    bool Add(const media::RecordedMedia& media, const media::RecordedPacket& packet) {
        const bool is_video = packet.medium == base::Medium::kVideo;
        std::array<char, 160> lines{};
        std::snprintf(lines.data(), lines.size(),
                      "\r\nContent-Length: %zu\r\nX-Capture-Time: %lld.%03d\r\nX-Timestamp: %lld\r\n",
                      packet.data.size(), static_cast<long long>(packet.captured_ms / 1000),
                      static_cast<int>(packet.captured_ms % 1000), static_cast<long long>(packet.time_ms * 1000));
        std::string head =
            "--" + output_.Boundary() +
            "\r\nContent-Type: " + (is_video ? "image/" + media.VideoCodec() : "audio/" + media.AudioCodec()) +
            lines.data() + "X-Codecs: " + media.VideoCodec() + ';' + media.AudioCodec() +
            "\r\nX-Video-Extra: " + Extra(media.VideoExtra()) + "\r\nX-Audio-Extra: " +
            Extra(media.AudioCodec() == "AAC" ? media.AudioExtra() : std::span<const std::uint8_t>()) + "\r\n";
        if (packet.number) {
            head += "X-Frame: " + std::to_string(*packet.number) + "\r\n";
        }
        head += "\r\n";
        std::string tail = "\r\n";
        std::array<iovec, 3> pieces{{{head.data(), head.size()},
                                     {const_cast<std::uint8_t*>(packet.data.data()), packet.data.size()},
                                     {tail.data(), tail.size()}}};
        return output_.Send(pieces);
    }

    // Says why what follows is not sent.
    bool Refuse(const std::string& sentence) {
        return Send("--" + output_.Boundary() + "\r\nContent-Type: text/plain\r\nContent-Length: " +
                    std::to_string(sentence.size()) + "\r\n\r\n" + sentence + "\r\n");
    }

    bool End() { return Send("--" + output_.Boundary() + "--\r\n"); }

  private:
    // As in live views, too much counts as none.
    static std::string Extra(std::span<const std::uint8_t> bytes) {
        if (bytes.size() > ring::kMaxExtraBytes) {
            return "";
        }
        return base::ToBase64({reinterpret_cast<const char*>(bytes.data()), bytes.size()});
    }
    bool Send(std::string text) {
        iovec piece{text.data(), text.size()};
        return output_.Send({&piece, 1});
    }

    binding::Output& output_;
};

// When the time of a recording is to be sent.
class Pace {
  public:
    Pace(std::int64_t begin_ms, double speed) : begin_ms_(begin_ms), speed_(speed) {}

    Clock::time_point Of(std::int64_t time_ms) const {
        const std::chrono::duration<double, std::milli> elapsed(static_cast<double>(time_ms - begin_ms_) / speed_);
        return began_ + std::chrono::duration_cast<Clock::duration>(elapsed) - kLead;
    }

  private:
    std::int64_t begin_ms_;
    double speed_;
    Clock::time_point began_ = Clock::now();
};

bool MustEnd(const Call& call) {
    return call.slot.MustEnd() || call.slot.player.is_excess || call.context.output()->IsBroken();
}

// False when the stream must end first.
bool Await(const Call& call, Clock::time_point due) {
    for (auto now = Clock::now(); now < due && !MustEnd(call); now = Clock::now()) {
        std::this_thread::sleep_for(std::min<Clock::duration>(due - now, kPoll));
    }
    return !MustEnd(call);
}

// False when the stream must end early. Throws Failure 406 where it continues in another codec.
bool SendAll(const Call& call, archive::RecordingReader& recording, media::RecordedMedia& media, const Pace& pace,
             Parts& parts) {
    const std::string codec = media.VideoCodec();
    for (std::int64_t before_ms = std::numeric_limits<std::int32_t>::min();;) {
        const std::optional<media::RecordedPacket> packet = media.Next();
        if (media.VideoCodec() != codec) {
            throw NotStreamed(media.VideoCodec());
        }
        if (packet) {
            if (!Await(call, pace.Of(before_ms)) || (!packet->data.empty() && !parts.Add(media, *packet))) {
                return false;
            }
            before_ms = packet->medium == base::Medium::kVideo ? packet->time_ms : before_ms;
        } else if (!recording.Grows()) {
            return true;
        } else if (!Await(call, Clock::now() + kTailPoll)) {
            return false;
        } else {
            recording.Refresh();
        }
    }
}

// The result of read. Throws Failure 500 where the recording is damaged or gone.
template <typename Read>
auto ReadOrFail(Read&& read) {
    const auto fail = [](const std::exception& error) {
        base::LogWarning(std::string("a recording cannot be streamed: ") + error.what());
        return Failure(500, "the recording cannot be read");
    };
    try {
        return read();
    } catch (const archive::ArchiveError& error) {
        throw fail(error);
    } catch (const std::system_error& error) {
        throw fail(error);
    }
}

}  // namespace

std::string Stream(const Call& call) {
    const double speed = SpeedOf(call);
    const std::int64_t key = KeyOf(call);
    const Footage footage = RequestedFootage(call);
    const bool with_sound = binding::MayUse(footage.camera_id, store::CameraAccess::kAudio);
    const int max_players = PlayersPerSession(call.Records());
    archive::RecordingReader recording =
        ReadOrFail([&] { return OpenFootage(call, footage, call.NumberOr("time_ms", 0)); });
    const int from = RequestedFrame(call, recording);
    RequireStreamed(call, recording.Header(recording.At(from).segment).codec);
    BecomePlayer(call, key, max_players);
    media::RecordedMedia media = ReadOrFail([&] { return media::RecordedMedia(recording, from, with_sound); });
    call.context.NoteStream();
    Parts parts(call);
    parts.Begin();
    const Pace pace(recording.At(from).time_ms, speed);
    try {
        if (ReadOrFail([&] { return SendAll(call, recording, media, pace, parts); })) {
            parts.End();
        }
    } catch (const Failure& failure) {
        parts.Refuse(failure.what());
    }
    return "";
}

}  // namespace lookhaven::api
