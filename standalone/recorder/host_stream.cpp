// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/host_stream.h"

#include <algorithm>
#include <chrono>
#include <cstring>
#include <deque>
#include <optional>
#include <span>
#include <stdexcept>
#include <utility>
#include <vector>

#include "standalone/base/clock.h"
#include "standalone/remote/forward.h"
#include "standalone/remote/forward_token.h"
#include "standalone/ring/stream_messages.h"

namespace lookhaven::recorder {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::seconds kMaxHeadWait{10};  // longer than that host waits for a picture
constexpr std::chrono::milliseconds kStep{100};
// Of the times that the other host says, one every five seconds: half a minute of them.
constexpr std::size_t kNotedClocks = 6;
// No clock counts more microseconds.
constexpr std::int64_t kMaxClockUs = std::int64_t{1} << 60;
constexpr std::size_t kMaxBodyBytes = base::kMaxFrameBytes;
constexpr int kOk = 200;
constexpr int kForbidden = 403;
constexpr int kNotFound = 404;

// What that host sends, in the thread that reads it.
class Connection : remote::AnswerSink {
    template <typename Function>
    auto Try(Function&& function) {
        try {
            return function();
        } catch (const remote::WrongCertificate&) {
            throw media::SourceError(name_ +
                                         " shows another certificate than the one it was added with, or an expired one",
                                     base::SignalLoss::kCertificate);
        } catch (const std::runtime_error& error) {
            throw media::SourceError(name_ + " cannot be asked for the stream: " + error.what(),
                                     base::SignalLoss::kUnreachable);
        }
    }

  public:
    Connection(const OtherHost& other, control::LiveStream stream, std::stop_token stop)
        : name_("host " + other.name),
          stop_(std::move(stop)) {
        remote::ForwardedRequest request;
        request.query = "api=VEXO.Host&version=1&method=Live";
        request.headers = {remote::HostTokenLine(other.key, other.id, other.own_id, base::WallSeconds())};
        request.json =
            R"({"camera":)" + std::to_string(stream.camera) + R"(,"stream":)" + std::to_string(stream.stream) + "}";
        request.max_head_wait = kMaxHeadWait;
        forwarding_ = Try([&] { return remote::BeginForward(other.host, request, *this); });
    }

    // The next bytes, valid until the next call. Throws media::SourceError when the answer has ended, on a stop request,
    // or when due has passed.
    std::span<const char> Read(std::size_t size, Clock::time_point due) {
        if (received_.size() - read_ < size) {
            received_.erase(received_.begin(), received_.begin() + static_cast<std::ptrdiff_t>(read_));
            read_ = 0;
        }
        while (received_.size() - read_ < size) {
            const bool goes_on = Try([&] { return forwarding_->Step(kStep); });
            if (stop_.stop_requested()) {
                throw media::SourceError("stopped");
            }
            if (!goes_on && received_.size() - read_ < size) {
                throw media::SourceError(failure_);
            }
            if (Clock::now() > due) {
                throw media::SourceError(name_ + " sends no picture", base::SignalLoss::kStalled);
            }
        }
        read_ += size;
        return std::span(received_).subspan(read_ - size, size);
    }

  private:
    bool Begin(const remote::AnswerHead& head) override {
        if (head.status != kOk) {
            failure_ = name_ +
                       (head.status == kForbidden  ? " refuses it: are the clocks more than five minutes apart?"
                        : head.status == kNotFound ? " knows no such request: it is of another version"
                                                   : " has no picture of it") +
                       " (status " + std::to_string(head.status) + ")";
        }
        return head.status == kOk;
    }

    bool Write(std::span<const char> bytes) override {
        received_.insert(received_.end(), bytes.begin(), bytes.end());
        return true;
    }

    bool WantsMore() override { return !stop_.stop_requested(); }

    const std::string name_;
    const std::stop_token stop_;
    std::string failure_ = name_ + " has ended the stream";
    std::vector<char> received_;
    std::size_t read_ = 0;                            // of what was received
    std::unique_ptr<remote::Forwarding> forwarding_;  // last: it uses the others
};

class HostStream : public media::Source {
  public:
    HostStream(const OtherHost& other, control::LiveStream stream, const media::SourceOptions& options,
               std::stop_token stop)
        : name_("host " + other.name),
          limit_(options.no_data_limit),
          connection_(other, stream, std::move(stop)) {
        while (!video_) {
            TakeFormat(ReadMessage());
        }
    }

    const std::optional<media::StreamFormat>& Audio() const override { return audio_; }

    media::Packet Next() override {
        for (;;) {
            const ring::MessageHead head = ReadMessage();
            const auto medium = static_cast<base::Medium>(head.medium);
            if (head.type == static_cast<std::uint8_t>(ring::MessageType::kClock)) {
                NoteClock(head.timestamp_us);
            } else if (head.type == static_cast<std::uint8_t>(ring::MessageType::kFrame)) {
                const std::optional<media::StreamFormat>& format = medium == base::Medium::kVideo ? video_ : audio_;
                if (!format || body_.empty()) {
                    Refuse("a frame without its format, or an empty one");
                }
                if (medium == base::Medium::kVideo) {
                    due_ = Clock::now() + limit_;
                }
                return {medium,
                        {reinterpret_cast<const std::uint8_t*>(body_.data()), body_.size()},
                        OwnTime(head.timestamp_us),
                        head.is_key != 0,
                        &*format};
            }
        }
    }

  private:
    // A host that shares the store is believed, but not that it is of this version, or sound.
    [[noreturn]] void Refuse(const char* what) const { throw media::SourceError(name_ + " sent " + what); }

    // Leaves the body in body_, until the next one is read.
    ring::MessageHead ReadMessage() {
        ring::MessageHead head;
        std::memcpy(&head, connection_.Read(sizeof head, due_).data(), sizeof head);
        if (head.body_bytes > kMaxBodyBytes || head.medium > static_cast<std::uint8_t>(base::Medium::kAudio)) {
            Refuse("a message that is no part of a stream");
        }
        body_ = connection_.Read(head.body_bytes, due_);
        return head;
    }

    void TakeFormat(const ring::MessageHead& head) {
        if (head.type != static_cast<std::uint8_t>(ring::MessageType::kFormat)) {
            return;
        }
        ring::FormatBody format;
        if (body_.size() < sizeof format || body_.size() > sizeof format + ring::kMaxExtraBytes) {
            Refuse("a format of another length");
        }
        std::memcpy(&format, body_.data(), sizeof format);
        const bool is_video = static_cast<base::Medium>(head.medium) == base::Medium::kVideo;
        const auto codec =
            base::CodecNamed(std::string(format.codec.data(), ::strnlen(format.codec.data(), format.codec.size())));
        const auto is_side = [&](std::int32_t side) {
            return is_video ? side > 0 && side <= base::kMaxSidePixels : side == 0;
        };
        if (!codec || base::IsVideo(*codec) != is_video || !is_side(format.width) || !is_side(format.height)) {
            Refuse("a format that is unknown here");
        }
        (is_video ? video_ : audio_) = media::StreamFormat{.codec = *codec,
                                                           .width = format.width,
                                                           .height = format.height,
                                                           .extra_data = {body_.begin() + sizeof format, body_.end()}};
        NoteClock(head.timestamp_us);
    }

    // Being under way only adds to the difference of the clocks, so the smallest of the last ones is the best estimate.
    // Older ones do not count: clocks drift, and that of a virtual machine stands still while it is moved.
    void NoteClock(std::int64_t sent_us) {
        offsets_us_.push_back(base::MonotonicMicros() - Checked(sent_us));
        if (offsets_us_.size() > kNotedClocks) {
            offsets_us_.pop_front();
        }
        offset_us_ = *std::ranges::min_element(offsets_us_);
    }

    // By this host's clock; never in the future.
    std::int64_t OwnTime(std::int64_t theirs_us) const {
        const std::int64_t now_us = base::MonotonicMicros();
        return std::clamp(Checked(theirs_us) + offset_us_, now_us - kMaxAgeUs, now_us);
    }

    std::int64_t Checked(std::int64_t time_us) const {
        if (time_us < 0 || time_us > kMaxClockUs) {
            Refuse("a time that no clock shows");
        }
        return time_us;
    }

    static constexpr std::int64_t kMaxAgeUs = 600'000'000;

    const std::string name_;
    const std::chrono::milliseconds limit_;
    Clock::time_point due_ = Clock::now() + std::max<Clock::duration>(limit_, kMaxHeadWait);
    std::span<const char> body_;
    std::optional<media::StreamFormat> video_;
    std::optional<media::StreamFormat> audio_;
    std::deque<std::int64_t> offsets_us_;  // this host's clock minus that one's, as noted last …
    std::int64_t offset_us_ = 0;           // … and the smallest of them
    Connection connection_;
};

}  // namespace

std::unique_ptr<media::Source> OpenHostStream(const OtherHost& other, control::LiveStream stream,
                                              const media::SourceOptions& options, std::stop_token stop) {
    return std::make_unique<HostStream>(other, stream, options, std::move(stop));
}

}  // namespace lookhaven::recorder
