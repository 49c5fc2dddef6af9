// SPDX-License-Identifier: Apache-2.0
//
// The shared library liblookhaven-remote.so: one transfer by libcurl.
//
// Why so        The paired host is trusted with what it was asked for and with nothing else: no header of its answer is
//               passed on but the content type, and that only when it is one of those expected.
#include "standalone/remote/transfer.h"

#include <algorithm>
#include <array>
#include <cstdlib>
#include <ctime>
#include <memory>

#include <curl/curl.h>
#include <sys/socket.h>

#include "standalone/remote/certificate.h"
#include "standalone/remote/pair_token.h"

namespace lookhaven::remote {

namespace {

constexpr long kConnectSeconds = 5;
constexpr long kMaxSilentSeconds = 60;
// What lies in buffers of a viewer who cannot keep up is old.
constexpr int kReceiveBytes = 192 << 10;
constexpr std::size_t kMaxContentTypeBytes = 200;

using List = std::unique_ptr<curl_slist, decltype(&curl_slist_free_all)>;

List ListOf(std::initializer_list<std::string> lines) {
    List list(nullptr, curl_slist_free_all);
    for (const std::string& line : lines) {
        curl_slist* longer = ::curl_slist_append(list.get(), line.c_str());
        if (longer == nullptr) {
            throw std::bad_alloc();
        }
        static_cast<void>(list.release());
        list.reset(longer);
    }
    return list;
}

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
          handle_(::curl_easy_init(), ::curl_easy_cleanup) {
        if (!handle_) {
            throw std::bad_alloc();
        }
        const std::string name = CertificateName(host.certificate);
        const std::string port = std::to_string(host.port);
        const bool is_ipv6 = host.address.find(':') != std::string::npos;
        const std::string address = is_ipv6 ? "[" + host.address + "]" : host.address;
        connect_to_ = ListOf({name + ":" + port + ":" + address + ":" + port});
        headers_ = ListOf({"Cookie: " + request.cookie, "Expect:"});
        curl_blob certificate{const_cast<char*>(host.certificate.data()), host.certificate.size(), CURL_BLOB_COPY};
        Set(CURLOPT_URL, ("https://" + name + ":" + port + "/webapi?" + request.query).c_str());
        Set(CURLOPT_CONNECT_TO, connect_to_.get());
        Set(CURLOPT_HTTPHEADER, headers_.get());
        if (!request.form.empty()) {
            Set(CURLOPT_COPYPOSTFIELDS, request.form.c_str());
        }
        Set(CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
        Set(CURLOPT_PROTOCOLS_STR, "https");
        Set(CURLOPT_NOPROXY, "*");
        Set(CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2));
        Set(CURLOPT_CAINFO_BLOB, &certificate);
        Set(CURLOPT_CAPATH, static_cast<const char*>(nullptr));
        Set(CURLOPT_CONNECTTIMEOUT, kConnectSeconds);
        Set(CURLOPT_TIMEOUT, static_cast<long>(expected.max_duration.count()));
        Set(CURLOPT_LOW_SPEED_LIMIT, 1L);
        Set(CURLOPT_LOW_SPEED_TIME, kMaxSilentSeconds);
        Set(CURLOPT_SOCKOPTFUNCTION, &Transfer::OnSocket);
        Set(CURLOPT_WRITEFUNCTION, &Transfer::OnBytes);
        Set(CURLOPT_WRITEDATA, this);
        Set(CURLOPT_NOPROGRESS, 0L);
        Set(CURLOPT_XFERINFOFUNCTION, &Transfer::OnProgress);
        Set(CURLOPT_XFERINFODATA, this);
        Set(CURLOPT_ERRORBUFFER, problem_.data());
    }

    bool Run() {
        const CURLcode result = ::curl_easy_perform(handle_.get());
        // An answer without a body has begun nothing either.
        if (!has_begun_ && result == CURLE_OK) {
            RequireExpected();
        }
        if (!has_begun_ && !is_refused_by_sink_) {
            if (result == CURLE_PEER_FAILED_VERIFICATION) {
                throw WrongCertificate("its certificate is not the one that it was paired with, or has expired");
            }
            throw NoAnswer(!refusal_.empty()     ? refusal_
                           : problem_[0] != '\0' ? problem_.data()
                                                 : ::curl_easy_strerror(result),
                           Status());
        }
        return result == CURLE_OK;
    }

  private:
    template <typename Value>
    void Set(CURLoption option, Value value) {
        if (::curl_easy_setopt(handle_.get(), option, value) != CURLE_OK) {
            throw std::runtime_error("libcurl lacks an option that this program needs");
        }
    }

    // Throws NoAnswer.
    void RequireExpected() const {
        const long status = Status();
        if (status == 401 || status == 403) {
            throw NoAnswer(WhyNotAdmitted(), status);
        }
        if (status != 200) {
            throw NoAnswer("it answers with status " + std::to_string(status), status);
        }
        if (!IsOneOf(expected_.content_types, ContentType())) {
            throw NoAnswer("its answer is not what was asked for", status);
        }
    }

    long Status() const {
        long status = 0;
        ::curl_easy_getinfo(handle_.get(), CURLINFO_RESPONSE_CODE, &status);
        return status;
    }

    // What proves this host's identity is valid for a few minutes only.
    std::string WhyNotAdmitted() const {
        curl_header* date = nullptr;
        if (::curl_easy_header(handle_.get(), "Date", 0, CURLH_HEADER, -1, &date) == CURLHE_OK) {
            const std::int64_t its_now_s = SecondsOf(date->value);
            const std::int64_t ahead_s = its_now_s - std::time(nullptr);
            if (its_now_s >= 0 && std::abs(ahead_s) > kPairTokenWindowSeconds) {
                return "its clock is " + std::to_string(std::abs(ahead_s) / 60) + " minutes " +
                       (ahead_s < 0 ? "behind" : "ahead of") + " this host's: set both right";
            }
        }
        return "it does not let this host in: it knows another secret, or has ended the pairing; pair the two anew";
    }

    std::string_view ContentType() const {
        const char* type = nullptr;
        ::curl_easy_getinfo(handle_.get(), CURLINFO_CONTENT_TYPE, &type);
        return type == nullptr ? "" : type;
    }

    bool Take(std::span<const char> bytes) {
        if (!has_begun_) {
            RequireExpected();
            curl_off_t size = -1;
            ::curl_easy_getinfo(handle_.get(), CURLINFO_CONTENT_LENGTH_DOWNLOAD_T, &size);
            has_begun_ = sink_.Begin(ContentType(), size);
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
        return static_cast<Transfer*>(self)->sink_.GoesOn() ? 0 : 1;
    }

    static int OnSocket(void*, curl_socket_t socket, curlsocktype) {
        ::setsockopt(socket, SOL_SOCKET, SO_RCVBUF, &kReceiveBytes, sizeof kReceiveBytes);
        return CURL_SOCKOPT_OK;
    }

    const Expected& expected_;
    Sink& sink_;
    List connect_to_{nullptr, curl_slist_free_all};
    List headers_{nullptr, curl_slist_free_all};
    std::array<char, CURL_ERROR_SIZE> problem_{};
    std::string refusal_;  // of the answer, by this program
    bool has_begun_ = false;
    bool is_refused_by_sink_ = false;
    std::unique_ptr<CURL, decltype(&::curl_easy_cleanup)> handle_;  // last, since it refers to the others
};

}  // namespace

}  // namespace lookhaven::remote

bool LookhavenFetch(const lookhaven::remote::Host& host, const lookhaven::remote::Request& request,
                    const lookhaven::remote::Expected& expected, lookhaven::remote::Sink& sink) {
    return lookhaven::remote::Transfer(host, request, expected, sink).Run();
}
