// SPDX-License-Identifier: Apache-2.0
#include "standalone/camera/isolated_source.h"

#include <algorithm>
#include <atomic>
#include <cerrno>
#include <cstring>
#include <functional>
#include <span>

#include <sys/socket.h>
#include <sys/time.h>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/camera/camera_process.h"
#include "standalone/camera/message_reader.h"
#include "standalone/media/source_kinds.h"

namespace lookhaven::camera {

namespace {

// Loading libav takes its time on a busy machine, whatever the limit of the camera.
constexpr std::chrono::milliseconds kStartLimit{20'000};

// One line each for as long as this process lives.
void ReportLacks(std::uint8_t lacks) {
    static std::atomic<std::uint8_t> reported = 0;
    const unsigned unreported = lacks & ~unsigned{reported.fetch_or(lacks)};
    if ((unreported & kLacksLandlock) != 0) {
        base::LogWarning(
            "this kernel has no Landlock: the processes that read cameras can read all files that this one can");
    }
    if ((unreported & kLacksSystemCallFilter) != 0) {
        base::LogWarning(
            "this kernel has no seccomp filters: the processes that read cameras can make any system call");
    }
}

class IsolatedSource : public media::Source {
  public:
    IsolatedSource(const std::string& url, const media::SourceOptions& options, std::stop_token stop)
        : stop_(stop),
          interrupt_(std::move(stop), [this] { ::shutdown(process_.Socket(), SHUT_RDWR); }),
          reader_([this](std::span<std::uint8_t> buffer, std::size_t at_least) { return Receive(buffer, at_least); }) {
        SetLimit(kStartLimit);
        Send(EncodeRequest({url, options}));
        ReportLacks(reader_.ReadConfined());
        SetLimit(options.no_data_limit);
        reader_.ReadOpened();
    }

    const std::optional<media::StreamFormat>& Audio() const override { return reader_.Audio(); }

    media::Packet Next() override {
        const media::Packet packet = reader_.Next();
        if (packet.medium == media::Medium::kVideo) {
            Rearm();
        }
        return packet;
    }

  private:
    // The process itself fails at the camera's limit; this one is for a process that does not.
    void SetLimit(std::chrono::milliseconds limit) {
        limit_ = limit;
        Rearm();
        const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(limit);
        const timeval wait{seconds.count(), std::chrono::microseconds(limit - seconds).count()};
        ::setsockopt(process_.Socket(), SOL_SOCKET, SO_RCVTIMEO, &wait, sizeof wait);
    }

    void Rearm() { due_us_ = base::MonotonicMicros() + std::chrono::microseconds(limit_).count(); }

    void Send(const std::vector<std::uint8_t>& request) {
        const auto size = static_cast<std::uint32_t>(request.size());
        std::vector<std::uint8_t> bytes(sizeof size);
        std::memcpy(bytes.data(), &size, sizeof size);
        bytes.insert(bytes.end(), request.begin(), request.end());
        // A socket that was just made takes so little at once; what fails shows when the answer is read.
        [[maybe_unused]] const ssize_t sent = ::send(process_.Socket(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
    }

    std::size_t Receive(std::span<std::uint8_t> buffer, std::size_t at_least) {
        std::size_t filled = 0;
        while (filled < at_least) {
            const std::size_t room = buffer.size() - filled;
            const int flags = room == at_least - filled ? MSG_WAITALL : 0;
            const ssize_t received = ::recv(process_.Socket(), buffer.data() + filled, room, flags);
            const int error = errno;
            if (stop_.stop_requested()) {
                throw media::SourceError("stopped");
            }
            if (base::MonotonicMicros() > due_us_ || (received < 0 && error == EAGAIN)) {
                throw media::SourceError("no picture for " + std::to_string(limit_.count()) + " ms",
                                         base::SignalLoss::kStalled);
            }
            if (received == 0 || (received < 0 && error != EINTR)) {
                throw media::SourceError(process_.End());
            }
            filled += static_cast<std::size_t>(std::max<ssize_t>(received, 0));
        }
        return filled;
    }

    const std::stop_token stop_;
    CameraProcess process_;
    std::chrono::milliseconds limit_{};
    std::int64_t due_us_ = 0;
    const std::stop_callback<std::function<void()>> interrupt_;
    MessageReader reader_;
};

}  // namespace

std::unique_ptr<media::Source> OpenIsolated(const std::string& url, const media::SourceOptions& options,
                                            std::stop_token stop) {
    return std::make_unique<IsolatedSource>(url, options, std::move(stop));
}

media::SourceKinds NetworkKinds() {
    media::SourceKinds kinds;
    for (const media::NetworkKind& kind : media::kNetworkKinds) {
        kinds.emplace(kind.beginning, OpenIsolated);
    }
    return kinds;
}

}  // namespace lookhaven::camera
