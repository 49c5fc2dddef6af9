// SPDX-License-Identifier: Apache-2.0
//
// VEXO.Host: what only another host of the same store may ask.
//
// Why so        Many viewers of that host may watch one camera of this one. Its recorder fetches the stream once, and
//               fills rings of its own with it. Who of its viewers may see and hear it, that host judges by the store
//               that both have: a host that lies about it has the store, and could make itself a session.
#include "standalone/api/forward_target.h"
#include "standalone/api/own_apis.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <cstring>
#include <span>
#include <string>
#include <thread>

#include "platform/live/livestream.h"
#include "standalone/base/clock.h"
#include "standalone/binding/live_ring.h"
#include "standalone/ring/reader.h"
#include "standalone/ring/stream_messages.h"

namespace lookhaven::api {

namespace {

constexpr std::int64_t kClockIntervalUs = 5'000'000;
// Longer than the recorder that asks waits for a picture.
constexpr std::int64_t kMaxSilentUs = 20'000'000;
constexpr std::chrono::milliseconds kPause{2};

bool Send(const Call& call, ring::MessageType type, const void* ring_address, std::span<const unsigned char> body,
          std::int64_t timestamp_us, bool is_key = false) {
    ring::MessageHead head{static_cast<std::uint8_t>(type),
                           static_cast<std::uint8_t>(ring::MediumOf(ring_address)),
                           is_key,
                           0,
                           static_cast<std::uint32_t>(body.size()),
                           timestamp_us};
    std::array<iovec, 2> pieces{{{&head, sizeof head}, {const_cast<unsigned char*>(body.data()), body.size()}}};
    return call.context.output()->Send(pieces);
}

void SendFormat(const Call& call, const void* ring_address) {
    ring::FormatBody format{ring::Width(ring_address), ring::Height(ring_address)};
    std::strncpy(format.codec.data(), ring::Codec(ring_address), format.codec.size() - 1);
    std::array<unsigned char, sizeof format + ring::kMaxExtraBytes> body{};
    const std::span<const unsigned char> extra = ring::ExtraData(ring_address);
    std::memcpy(body.data(), &format, sizeof format);
    std::copy(extra.begin(), extra.end(), body.begin() + sizeof format);
    Send(call, ring::MessageType::kFormat, ring_address, std::span(body).first(sizeof format + extra.size()),
         base::MonotonicMicros());
}

// One of the stream's two rings.
class RingReader {
  public:
    explicit RingReader(ShmStreamFifo& ring) : ring_(ring) { ring_.StartRead(&position_); }

    // Sends the next entry; false when there is none yet, or the connection is broken. The pictures' waits up to a tenth
    // of a second for an entry of either ring.
    bool SendNext(const Call& call) {
        DataEntry* const held = ring_.ReadNext(sequence_, &position_);
        bool is_sent = false;
        if (held != nullptr) {
            const auto& entry = *reinterpret_cast<const ring::Entry*>(held);
            sequence_ = entry.sequence;
            is_sent = Send(call, ring::MessageType::kFrame, &ring_,
                           {entry.Data() + entry.offset, entry.Data() + entry.length}, entry.TimestampMicros(),
                           (entry.flags & ring::kKeyFrame) != 0);
        }
        ring_.ReadFinish(held, ring::MediumOf(&ring_) == base::Medium::kVideo, &position_);
        return is_sent;
    }

  private:
    ShmStreamFifo& ring_;
    __tag_DATA_ENTRY_INFO position_;
    int sequence_ = DATA_ENTRY_SEQ_NONE;
};

// The process ends with its connection, and with a ring that is replaced: it leaves nothing that must be given back.
std::string Live(const Call& call) {
    const control::LiveStream stream{call.Parameter("camera").asInt(), call.Parameter("stream").asInt()};
    if (HostOfCamera(call.Records(), stream.camera) != call.context.Installation().HostId()) {
        throw Failure(503, "the camera has moved to another host", http::kRetrySoonSeconds);
    }
    ShmStreamFifo* const video = binding::AttachLiveRing(stream);
    ShmStreamFifo* const sound = video == nullptr ? nullptr : LiveAdoStreamFifoAt(stream.camera, stream.stream);
    if (sound == nullptr) {
        throw Failure(504, "no picture came", http::kRetrySoonSeconds);
    }
    call.context.NoteStream();
    binding::Output& output = *call.context.output();
    std::string head = "Status: 200 OK\r\nContent-Type: application/octet-stream\r\nCache-Control: no-store\r\n"
                       "X-Accel-Buffering: no\r\n\r\n";
    iovec piece{head.data(), head.size()};
    output.Send({&piece, 1});
    if (*ring::Codec(sound) != '\0') {
        SendFormat(call, sound);
    }
    SendFormat(call, video);
    RingReader pictures(*video);
    RingReader sounds(*sound);
    LiveStreamUpdater demand(stream.camera, stream.stream);
    std::int64_t clock_us = base::MonotonicMicros();
    for (std::int64_t sent_us = clock_us; !call.slot.MustEnd() && !output.IsBroken();) {
        demand.UpdateStamp();
        const bool has_sent_picture = pictures.SendNext(call);
        const bool has_sent_sound = sounds.SendNext(call);
        const std::int64_t now_us = base::MonotonicMicros();
        if (has_sent_picture || has_sent_sound) {
            sent_us = now_us;
        } else if (now_us - sent_us < kMaxSilentUs) {
            std::this_thread::sleep_for(kPause);  // while the connection is full, no ring waits
        } else {
            break;
        }
        if (now_us - clock_us > kClockIntervalUs) {
            clock_us = now_us;
            Send(call, ring::MessageType::kClock, video, {}, now_us);
        }
    }
    return "";
}

constexpr Method kMethods[] = {{"Live", Live, Method::Accepts::kPostOnly}};

}  // namespace

const OwnApi kHostApi{"VEXO.Host", kMethods, false};

}  // namespace lookhaven::api
