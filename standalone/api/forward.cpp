// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/forward.h"

#include <algorithm>
#include <array>
#include <chrono>
#include <thread>

#include <poll.h>
#include <unistd.h>

#include "standalone/api/admit.h"
#include "standalone/base/clock.h"
#include "standalone/base/concat.h"
#include "standalone/base/log.h"
#include "standalone/binding/compact_json.h"
#include "standalone/binding/send_queue.h"
#include "standalone/remote/forward.h"
#include "standalone/remote/forward_token.h"
#include "standalone/store/sessions.h"

namespace lookhaven::api {

namespace {

constexpr std::chrono::seconds kMaxSilentLive{60};
// Less than for others, since a viewer may have waited for a ring before.
constexpr std::chrono::seconds kMaxLiveHeadWait{24};
// Small, since pictures that wait in it grow old where the viewer cannot keep up.
constexpr int kLiveReceiveBytes = 64 << 10;
constexpr std::size_t kMaxTagBytes = 100;
constexpr int kBadGateway = 502;
// Per host; a player answers within a second.
constexpr std::chrono::seconds kMaxSearch{3};
constexpr std::chrono::milliseconds kDrainPoll{3};
// A picture arrives in several pieces within this time.
constexpr std::chrono::milliseconds kPictureTime{20};

bool IsPrintable(std::string_view text) {
    return std::ranges::all_of(text, [](char character) { return character >= ' ' && character <= '~'; });
}

// The cookies that admit the caller, under the names that they have over HTTPS.
std::string CookiesOf(const Call& call) {
    if (call.login) {
        return "__Host-id=" + call.cookies.at(SessionCookie(call.request));
    }
    const auto timestamp = call.cookies.find("timestamp");
    return timestamp == call.cookies.end() ? "" : "timestamp=" + timestamp->second;
}

remote::ForwardedRequest RequestOf(const Call& call, const store::Host& host, Forwarded kind) {
    remote::ForwardedRequest request;
    request.query = "api=" + call.api + "&version=" + std::to_string(call.version) + "&method=" + call.method;
    const std::string key = store::Sessions(call.Records()).Key();
    request.headers.push_back(
        remote::ForwardTokenLine(key, host.id, call.request.Header("REMOTE_ADDR"), base::WallSeconds()));
    request.headers.push_back("Cookie: " + CookiesOf(call));
    const std::string_view tag = call.request.Header("HTTP_IF_NONE_MATCH");
    if (!tag.empty() && tag.size() <= kMaxTagBytes && IsPrintable(tag)) {
        request.headers.push_back("If-None-Match: " + std::string(tag));
    }
    Json::Value parameters(Json::objectValue);
    for (const auto& [name, value] : call.parameters) {
        if (name != "api" && name != "version" && name != "method") {
            parameters[name] = value;
        }
    }
    binding::AppendCompactJson(request.json, parameters);
    if (kind == Forwarded::kLive) {
        request.max_silent = kMaxSilentLive;
        request.max_head_wait = kMaxLiveHeadWait;
        request.receive_bytes = kLiveReceiveBytes;
    }
    if (kind == Forwarded::kSearch) {
        request.max_head_wait = kMaxSearch;
    }
    return request;
}

class AnswerForwarder : public remote::AnswerSink {
  public:
    AnswerForwarder(const Call& call, Forwarded kind) : call_(call), output_(*call.context.output()), kind_(kind) {}

    bool Begin(const remote::AnswerHead& head) override {
        status_ = head.status;
        is_from_host_ = head.is_from_host;
        if (IsWithheld()) {
            return false;
        }
        if (!head.content_type.starts_with("image/") && !head.content_type.starts_with("application/json")) {
            call_.context.NoteStream();
        }
        call_.slot.status = head.status;
        std::string lines = http::StatusLine(head.status);
        const auto add = [&lines](std::string_view name, std::string_view value) {
            lines.append(name).append(": ").append(value).append("\r\n");
        };
        for (const auto& [name, value] : head.headers) {
            add(name, value);
        }
        if (!head.content_type.empty()) {
            add("Content-Type", head.content_type);
        }
        if (!head.location.empty()) {
            add("Location", head.location);
        }
        if (head.size_bytes >= 0) {
            add("Content-Length", std::to_string(head.size_bytes));
        }
        return Send(lines.append("\r\n"));
    }

    bool Write(std::span<const char> bytes) override {
        if (kind_ == Forwarded::kLive) {
            AwaitDrained();
        }
        return Send(bytes);
    }

    // Looks at the connection, since a viewer who has gone is otherwise noticed only when something is sent.
    bool WantsMore() override {
        pollfd viewer{STDOUT_FILENO, POLLRDHUP, 0};
        return !call_.slot.MustEnd() && (::poll(&viewer, 1, 0) <= 0 || (viewer.revents & (POLLRDHUP | POLLHUP)) == 0);
    }

    // Whether the other web server answered for a host that is offline.
    bool IsBadGateway() const { return status_ == kBadGateway && !is_from_host_; }
    bool IsWithheld() const {
        const bool is_of_player = status_ < 400 || status_ == 400 || status_ == 409;
        return IsBadGateway() || (kind_ == Forwarded::kControl && status_ == 404) ||
               (kind_ == Forwarded::kSearch && !is_of_player);
    }

  private:
    // As a stream of this host's own: what waits for a viewer who cannot keep up waits at the other host, which drops
    // pictures, and not here, where it gets old.
    void AwaitDrained() {
        binding::SendQueue* const queue = call_.context.Queue();
        if (queue == nullptr || std::chrono::steady_clock::now() < next_look_) {
            return;
        }
        while (!queue->IsDrained() && !queue->TakeOverduePicture() && WantsMore()) {
            std::this_thread::sleep_for(kDrainPoll);
        }
        next_look_ = std::chrono::steady_clock::now() + kPictureTime;
    }

    bool Send(std::span<const char> bytes) {
        iovec piece{const_cast<char*>(bytes.data()), bytes.size()};
        return output_.Send({&piece, 1});
    }

    const Call& call_;
    binding::Output& output_;
    const Forwarded kind_;
    std::chrono::steady_clock::time_point next_look_;
    int status_ = 0;
    bool is_from_host_ = false;
};

Failure Offline(const store::Host& host, const std::string& what, const std::string& why) {
    base::LogWarning("host " + host.name + " does not answer a forwarded request: " + why);
    return Failure(503, what + " is on host " + host.name + ", which is offline", http::kRetrySoonSeconds);
}

}  // namespace

bool TakeForwarded(http::Request& request, const base::Installation& installation) {
    const auto token = request.headers.find(remote::kForwardHeaderInScgi);
    const int own_host = token == request.headers.end() ? 0 : installation.HostId();
    if (own_host == 0) {
        return false;
    }
    const std::optional<std::string> client =
        remote::ClientInForwardToken(token->second, store::Sessions(binding::RequestContext::Current().Records()).Key(),
                                     own_host, base::WallSeconds());
    if (!client) {
        throw Failure(403, "no host of this installation has forwarded this request, or its clock is more than five"
                           " minutes off");
    }
    request.headers["REMOTE_ADDR"] = *client;
    return true;
}

int RequireHost(const Call& call) {
    const auto token = call.request.headers.find(remote::kHostHeaderInScgi);
    const int own_host = token == call.request.headers.end() ? 0 : call.context.Installation().HostId();
    const std::optional<int> host =
        own_host == 0
            ? std::nullopt
            : remote::HostInToken(token->second, store::Sessions(call.Records()).Key(), own_host, base::WallSeconds());
    if (!host || *host == own_host || !store::Hosts(call.Records()).Find(*host)) {
        throw Failure(403, "only another host of this installation may ask for this");
    }
    return *host;
}

std::string LinesForForwarder(const http::Request& request) {
    return request.headers.contains(remote::kForwardHeaderInScgi) ? base::Concat(remote::kHostAnswers, ": yes\r\n")
                                                                  : "";
}

bool Forward(const Call& call, const store::Host& host, Forwarded kind, const std::string& what) {
    const remote::ForwardedRequest request = RequestOf(call, host, kind);
    call.context.CloseRecords();
    AnswerForwarder forwarder(call, kind);
    try {
        const bool is_whole = remote::Forward({host.address, host.port, host.certificate}, request, forwarder);
        if (!is_whole && !forwarder.IsWithheld() && forwarder.WantsMore()) {
            base::LogWarning("host " + host.name + " broke off its answer to " + call.api + '/' + call.method);
        }
    } catch (const remote::WrongCertificate&) {
        throw Offline(host, what, "it shows another certificate than the one it was added with, or an expired one");
    } catch (const std::runtime_error& error) {
        throw Offline(host, what, error.what());
    }
    if (forwarder.IsBadGateway()) {
        throw Offline(host, what, "only its web server runs");
    }
    return !forwarder.IsWithheld();
}

}  // namespace lookhaven::api
