// SPDX-License-Identifier: Apache-2.0
//
// The shared library liblookhaven-remote.so: one transfer by libcurl.
//
// Why so        The paired host is trusted with what it was asked for and with nothing else: no header of its answer is
//               passed on but the content type, and that only when it is one of those expected.
#include "standalone/remote/transfer.h"

#include <algorithm>
#include <cstdlib>
#include <ctime>

#include <sys/socket.h>

#include "standalone/remote/pair_token.h"
#include "standalone/remote/pinned_handle.h"

namespace lookhaven::remote {

namespace {

constexpr long kConnectSeconds = 5;
constexpr long kMaxSilentSeconds = 60;
// What lies in buffers of a viewer who cannot keep up is old.
constexpr int kReceiveBytes = 192 << 10;
constexpr std::size_t kMaxContentTypeBytes = 200;

bool IsOneOf(std::span<const std::string_view> types, std::string_view type) {
    const auto is_printable = [](char c) { return c >= ' ' && c <= '~'; };
    std::string name(type.substr(0, type.find(';')));
    name.erase(name.find_last_not_of(' ') + 1);
    std::ranges::transform(name, name.begin(), [](char c) { return c >= 'A' && c <= 'Z' ? c + ('a' - 'A') : c; });
    return type.size() <= kMaxContentTypeBytes && std::ranges::all_of(type, is_printable) &&
           std::ranges::find(types, name) != types.end();
}

// Reads a date of the form that HTTP wants; -1 where it is none. What libcurl has for it returns a time_t, which has 32
// bits in the library of a 32-bit machine, but not here.
std::int64_t SecondsOf(const char* date) {
    std::tm parts{};
    const char* rest = ::strptime(date, "%a, %d %b %Y %H:%M:%S GMT", &parts);
    return rest == nullptr || *rest != '\0' ? -1 : ::timegm(&parts);
}

class Transfer {
  public:
    Transfer(const Host& host, const Request& request, const Expected& expected, Sink& sink)
        : expected_(expected),
          sink_(sink),
          handle_(host, request.query, {"Cookie: " + request.cookie, "Expect:"}) {
        if (!request.form.empty()) {
            handle_.Set(CURLOPT_COPYPOSTFIELDS, request.form.c_str());
        }
        handle_.Set(CURLOPT_CONNECTTIMEOUT, kConnectSeconds);
        handle_.Set(CURLOPT_TIMEOUT, static_cast<long>(expected.max_duration.count()));
        handle_.Set(CURLOPT_LOW_SPEED_LIMIT, 1L);
        handle_.Set(CURLOPT_LOW_SPEED_TIME, kMaxSilentSeconds);
        handle_.Set(CURLOPT_SOCKOPTFUNCTION, &Transfer::OnSocket);
        handle_.Set(CURLOPT_WRITEFUNCTION, &Transfer::OnBytes);
        handle_.Set(CURLOPT_WRITEDATA, this);
        handle_.Set(CURLOPT_NOPROGRESS, 0L);
        handle_.Set(CURLOPT_XFERINFOFUNCTION, &Transfer::OnProgress);
        handle_.Set(CURLOPT_XFERINFODATA, this);
    }

    bool Run() {
        const CURLcode result = handle_.Perform();
        // An answer without a body has begun nothing either.
        if (!has_begun_ && result == CURLE_OK) {
            RequireExpected();
        }
        if (!has_begun_ && !is_refused_by_sink_) {
            if (!refusal_.empty()) {
                throw NoAnswer(refusal_, handle_.Status());
            }
            handle_.ThrowNoAnswer(result);
        }
        return result == CURLE_OK;
    }

  private:
    // Throws NoAnswer.
    void RequireExpected() const {
        const long status = handle_.Status();
        if (status == 401 || status == 403) {
            throw NoAnswer(WhyNotAdmitted(), status);
        }
        if (status != 200) {
            throw NoAnswer("it answers with status " + std::to_string(status), status);
        }
        if (!IsOneOf(expected_.content_types, handle_.ContentType())) {
            throw NoAnswer("its answer is not what was asked for", status);
        }
    }

    // What proves this host's identity is valid for a few minutes only.
    std::string WhyNotAdmitted() const {
        const std::int64_t its_now_s = SecondsOf(handle_.Header("Date").c_str());
        const std::int64_t ahead_s = its_now_s - std::time(nullptr);
        if (its_now_s >= 0 && std::abs(ahead_s) > kPairTokenWindowSeconds) {
            return "its clock is " + std::to_string(std::abs(ahead_s) / 60) + " minutes " +
                   (ahead_s < 0 ? "behind" : "ahead of") + " this host's: set both right";
        }
        return "it does not let this host in: it knows another secret, or has ended the pairing; pair the two again";
    }

    bool Take(std::span<const char> bytes) {
        if (!has_begun_) {
            RequireExpected();
            has_begun_ = sink_.Begin(handle_.ContentType(), handle_.SizeBytes());
            is_refused_by_sink_ = !has_begun_;
        }
        return has_begun_ && sink_.Write(bytes);
    }

    // No exception may pass through libcurl.
    static std::size_t OnBytes(char* bytes, std::size_t size, std::size_t count, void* self) {
        Transfer& transfer = *static_cast<Transfer*>(self);
        try {
            return transfer.Take({bytes, size * count}) ? size * count : CURL_WRITEFUNC_ERROR;
        } catch (const std::exception& error) {
            transfer.refusal_ = error.what();
            return CURL_WRITEFUNC_ERROR;
        }
    }

    static int OnProgress(void* self, curl_off_t, curl_off_t, curl_off_t, curl_off_t) {
        return static_cast<Transfer*>(self)->sink_.WantsMore() ? 0 : 1;
    }

    static int OnSocket(void*, curl_socket_t socket, curlsocktype) {
        ::setsockopt(socket, SOL_SOCKET, SO_RCVBUF, &kReceiveBytes, sizeof kReceiveBytes);
        return CURL_SOCKOPT_OK;
    }

    const Expected& expected_;
    Sink& sink_;
    std::string refusal_;  // of the answer, by this program
    bool has_begun_ = false;
    bool is_refused_by_sink_ = false;
    PinnedHandle handle_;
};

}  // namespace

}  // namespace lookhaven::remote

bool LookhavenFetch(const lookhaven::remote::Host& host, const lookhaven::remote::Request& request,
                    const lookhaven::remote::Expected& expected, lookhaven::remote::Sink& sink) {
    return lookhaven::remote::Transfer(host, request, expected, sink).Run();
}
