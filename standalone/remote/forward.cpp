// SPDX-License-Identifier: Apache-2.0
//
// In the shared library liblookhaven-remote.so: one forwarded request.
#include "standalone/remote/forward.h"

#include <algorithm>
#include <string_view>

#include <netinet/in.h>
#include <netinet/tcp.h>
#include <sys/socket.h>

#include "standalone/remote/pinned_handle.h"

namespace lookhaven::remote {

namespace {

using Clock = std::chrono::steady_clock;

constexpr long kConnectMillis = 3'000;
constexpr long kKeepAliveSeconds = 5;
constexpr unsigned int kMaxUnansweredMillis = 20'000;
constexpr std::size_t kMaxHeaderBytes = 1'000;
constexpr const char* kForwardedHeaders[] = {"Cache-Control", "Content-Disposition", "ETag", "Retry-After",
                                             "Vary",          "X-Capture-Time"};
constexpr int kFound = 302;
constexpr int kNotModified = 304;

bool IsPlain(std::string_view text) {
    return text.size() <= kMaxHeaderBytes &&
           std::ranges::all_of(text, [](char character) { return character >= ' ' && character <= '~'; });
}

// Without scheme and host, which that host's web server may have added.
std::string PathOf(std::string_view location) {
    if (const std::size_t scheme_end = location.find("://"); scheme_end != location.npos) {
        location.remove_prefix(std::min(location.find('/', scheme_end + 3), location.size()));
    }
    // "//name" would lead to another host, as would "/\name" in a browser.
    const bool is_path =
        location.starts_with('/') && !location.starts_with("//") && location.find('\\') == location.npos;
    return is_path && IsPlain(location) ? std::string(location) : "";
}

class ForwardedTransfer : public Forwarding {
  public:
    ForwardedTransfer(const Host& host, const ForwardedRequest& request, AnswerSink& sink)
        : sink_(sink),
          receive_bytes_(request.receive_bytes),
          max_head_wait_(request.max_head_wait),
          handle_(host, request.query, LinesOf(request)) {
        handle_.Set(CURLOPT_POSTFIELDSIZE_LARGE, static_cast<curl_off_t>(request.json.size()));
        handle_.Set(CURLOPT_COPYPOSTFIELDS, request.json.data());
        handle_.Set(CURLOPT_CONNECTTIMEOUT_MS, kConnectMillis);
        handle_.Set(CURLOPT_LOW_SPEED_LIMIT, request.max_silent.count() > 0 ? 1L : 0L);
        handle_.Set(CURLOPT_LOW_SPEED_TIME, static_cast<long>(request.max_silent.count()));
        handle_.Set(CURLOPT_TCP_KEEPALIVE, 1L);
        handle_.Set(CURLOPT_TCP_KEEPIDLE, kKeepAliveSeconds);
        handle_.Set(CURLOPT_TCP_KEEPINTVL, kKeepAliveSeconds);
        handle_.Set(CURLOPT_SOCKOPTFUNCTION, &ForwardedTransfer::OnSocket);
        handle_.Set(CURLOPT_SOCKOPTDATA, this);
        handle_.Set(CURLOPT_WRITEFUNCTION, &ForwardedTransfer::OnBytes);
        handle_.Set(CURLOPT_WRITEDATA, this);
        handle_.Set(CURLOPT_HEADERFUNCTION, &ForwardedTransfer::OnHeader);
        handle_.Set(CURLOPT_HEADERDATA, this);
        handle_.Set(CURLOPT_NOPROGRESS, 0L);
        handle_.Set(CURLOPT_XFERINFOFUNCTION, &ForwardedTransfer::OnProgress);
        handle_.Set(CURLOPT_XFERINFODATA, this);
        if (multi_ == nullptr || ::curl_multi_add_handle(multi_.get(), handle_.Get()) != CURLM_OK) {
            throw std::bad_alloc();
        }
    }
    ~ForwardedTransfer() override { ::curl_multi_remove_handle(multi_.get(), handle_.Get()); }
    ForwardedTransfer(const ForwardedTransfer&) = delete;
    ForwardedTransfer& operator=(const ForwardedTransfer&) = delete;

    bool Step(std::chrono::milliseconds limit) override {
        has_come_ = false;
        int running = 0;
        if (::curl_multi_perform(multi_.get(), &running) != CURLM_OK) {
            throw std::bad_alloc();
        }
        if (running == 0) {
            int left = 0;
            const CURLMsg* const message = ::curl_multi_info_read(multi_.get(), &left);
            End(message == nullptr ? CURLE_RECV_ERROR : message->data.result);
            return false;
        }
        if (!has_come_ &&
            ::curl_multi_poll(multi_.get(), nullptr, 0, static_cast<int>(limit.count()), nullptr) != CURLM_OK) {
            throw std::bad_alloc();
        }
        return true;
    }

    bool IsComplete() const override { return is_complete_; }

  private:
    void End(CURLcode result) {
        if (result == CURLE_OK && !has_begun_) {
            if (!has_whole_head_) {
                throw NoAnswer("it broke off its answer");
            }
            Begin();
        }
        if (!has_begun_) {
            if (is_late_) {
                throw NoAnswer("it does not answer in time");
            }
            if (!problem_.empty()) {
                throw NoAnswer(problem_);
            }
            if (!is_ended_by_sink_) {
                handle_.ThrowNoAnswer(result);
            }
        }
        is_complete_ = result == CURLE_OK && !is_ended_by_sink_;
    }

    static std::vector<std::string> LinesOf(const ForwardedRequest& request) {
        std::vector<std::string> lines = request.headers;
        lines.insert(lines.end(), {"Content-Type: application/json", "Expect:"});
        return lines;
    }

    AnswerHead Head() const {
        const long status = handle_.Status();
        const bool is_foreign_redirect = status >= 300 && status < 400 && status != kFound && status != kNotModified;
        if (status < 200 || status > 599 || is_foreign_redirect) {
            throw NoAnswer("it answers with status " + std::to_string(status), status);
        }
        AnswerHead head;
        head.status = static_cast<int>(status);
        head.size_bytes = handle_.SizeBytes();
        head.is_from_host = !handle_.Header(kHostAnswers).empty();
        if (const std::string type = handle_.ContentType(); IsPlain(type)) {
            head.content_type = type;
        }
        for (const char* name : kForwardedHeaders) {
            if (std::string value = handle_.Header(name); !value.empty() && IsPlain(value)) {
                head.headers.emplace_back(name, std::move(value));
            }
        }
        if (status == kFound) {
            head.location = PathOf(handle_.Header("Location"));
        }
        return head;
    }

    void Begin() {
        const AnswerHead head = Head();
        has_begun_ = true;
        is_ended_by_sink_ = !sink_.Begin(head);
    }

    bool Take(std::span<const char> bytes) {
        has_come_ = true;
        if (!has_begun_) {
            Begin();
        }
        is_ended_by_sink_ = is_ended_by_sink_ || !sink_.Write(bytes);
        return !is_ended_by_sink_;
    }

    // No exception may pass through libcurl.
    static std::size_t OnBytes(char* bytes, std::size_t size, std::size_t count, void* self) {
        ForwardedTransfer& transfer = *static_cast<ForwardedTransfer*>(self);
        try {
            return transfer.Take({bytes, size * count}) ? size * count : CURL_WRITEFUNC_ERROR;
        } catch (const std::exception& error) {
            transfer.problem_ = error.what();
            return CURL_WRITEFUNC_ERROR;
        }
    }

    // A head that is cut off counts as one for libcurl.
    static std::size_t OnHeader(char* bytes, std::size_t size, std::size_t count, void* self) {
        const std::string_view line(bytes, size * count);
        static_cast<ForwardedTransfer*>(self)->has_whole_head_ = line == "\r\n" || line == "\n";
        return line.size();
    }

    static int OnProgress(void* self, curl_off_t, curl_off_t, curl_off_t, curl_off_t) {
        ForwardedTransfer& transfer = *static_cast<ForwardedTransfer*>(self);
        transfer.is_late_ = !transfer.has_begun_ && Clock::now() - transfer.began_ > transfer.max_head_wait_;
        transfer.is_ended_by_sink_ = transfer.is_ended_by_sink_ || !transfer.sink_.WantsMore();
        return transfer.is_late_ || transfer.is_ended_by_sink_ ? 1 : 0;
    }

    static int OnSocket(void* self, curl_socket_t socket, curlsocktype) {
        ::setsockopt(socket, IPPROTO_TCP, TCP_USER_TIMEOUT, &kMaxUnansweredMillis, sizeof kMaxUnansweredMillis);
        if (const int bytes = static_cast<ForwardedTransfer*>(self)->receive_bytes_; bytes > 0) {
            ::setsockopt(socket, SOL_SOCKET, SO_RCVBUF, &bytes, sizeof bytes);
        }
        return CURL_SOCKOPT_OK;
    }

    AnswerSink& sink_;
    const int receive_bytes_;
    const std::chrono::seconds max_head_wait_;
    const Clock::time_point began_ = Clock::now();
    std::string problem_;
    bool is_late_ = false;
    bool has_whole_head_ = false;
    bool has_begun_ = false;
    bool is_ended_by_sink_ = false;
    bool is_complete_ = false;
    bool has_come_ = false;  // a part of the body, in this step
    PinnedHandle handle_;
    const std::unique_ptr<CURLM, decltype(&::curl_multi_cleanup)> multi_{::curl_multi_init(), &::curl_multi_cleanup};
};

}  // namespace

}  // namespace lookhaven::remote

lookhaven::remote::Forwarding* LookhavenBeginForward(const lookhaven::remote::Host& host,
                                                     const lookhaven::remote::ForwardedRequest& request,
                                                     lookhaven::remote::AnswerSink& sink) {
    return new lookhaven::remote::ForwardedTransfer(host, request, sink);
}
