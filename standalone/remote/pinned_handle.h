// SPDX-License-Identifier: Apache-2.0
//
// A handle of libcurl that asks one host's web API, and that host alone: over TLS, with its certificate pinned.
#pragma once

#include <array>
#include <cstdint>
#include <memory>
#include <new>
#include <stdexcept>
#include <string>
#include <vector>

#include <curl/curl.h>

#include "standalone/remote/fetch.h"

namespace lookhaven::remote {

class PinnedHandle {
  public:
    // query: without '?'. headers: "Name: value" each. Throws InvalidCertificate.
    PinnedHandle(const Host& host, const std::string& query, const std::vector<std::string>& headers);
    PinnedHandle(const PinnedHandle&) = delete;
    PinnedHandle& operator=(const PinnedHandle&) = delete;

    template <typename Value>
    void Set(CURLoption option, Value value) {
        if (::curl_easy_setopt(handle_.get(), option, value) != CURLE_OK) {
            throw std::runtime_error("libcurl lacks an option that this program needs");
        }
    }
    CURL* Get() const { return handle_.get(); }
    CURLcode Perform() { return ::curl_easy_perform(handle_.get()); }

    // What is known of the answer so far.
    long Status() const;
    std::string ContentType() const;
    std::int64_t SizeBytes() const;  // of its body; -1 when it is not known
    // Empty when it has no such header.
    std::string Header(const char* name) const;

    // Throws NoAnswer, or WrongCertificate.
    [[noreturn]] void ThrowNoAnswer(CURLcode result) const;

  private:
    using List = std::unique_ptr<curl_slist, decltype(&curl_slist_free_all)>;
    static List ListOf(const std::vector<std::string>& lines);

    List connect_to_{nullptr, ::curl_slist_free_all};
    List headers_{nullptr, ::curl_slist_free_all};
    std::array<char, CURL_ERROR_SIZE> problem_{};
    std::unique_ptr<CURL, decltype(&::curl_easy_cleanup)> handle_;  // last, since it refers to the others
};

}  // namespace lookhaven::remote
