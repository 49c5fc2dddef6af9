// SPDX-License-Identifier: Apache-2.0
//
// A part of the shared library liblookhaven-remote.so: which certificates a web server shows.
#include "standalone/remote/transfer.h"

#include <memory>

#include <curl/curl.h>

namespace lookhaven::remote {

namespace {

constexpr long kMaxSeconds = 5;
constexpr std::string_view kCertificate = "Cert:";

template <typename Value>
void Set(CURL* handle, CURLoption option, Value value) {
    if (::curl_easy_setopt(handle, option, value) != CURLE_OK) {
        throw std::runtime_error("libcurl lacks an option that this program needs");
    }
}

}  // namespace

}  // namespace lookhaven::remote

void LookhavenFetchCertificates(const std::string& address, int port, std::string& pem) {
    using namespace lookhaven::remote;
    const std::unique_ptr<CURL, decltype(&::curl_easy_cleanup)> owned(::curl_easy_init(), ::curl_easy_cleanup);
    CURL* const handle = owned.get();
    if (handle == nullptr) {
        throw std::bad_alloc();
    }
    const bool is_ipv6 = address.find(':') != std::string::npos;
    const std::string host = is_ipv6 ? "[" + address + "]" : address;
    Set(handle, CURLOPT_URL, ("https://" + host + ":" + std::to_string(port) + "/").c_str());
    Set(handle, CURLOPT_CONNECT_ONLY, 1L);
    Set(handle, CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
    Set(handle, CURLOPT_PROTOCOLS_STR, "https");
    Set(handle, CURLOPT_NOPROXY, "*");
    Set(handle, CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2));
    Set(handle, CURLOPT_SSL_VERIFYPEER, 0L);
    Set(handle, CURLOPT_SSL_VERIFYHOST, 0L);
    Set(handle, CURLOPT_CERTINFO, 1L);
    Set(handle, CURLOPT_TIMEOUT, kMaxSeconds);
    if (const CURLcode result = ::curl_easy_perform(handle); result != CURLE_OK) {
        throw NoAnswer(::curl_easy_strerror(result));
    }
    curl_certinfo* shown = nullptr;
    ::curl_easy_getinfo(handle, CURLINFO_CERTINFO, &shown);
    for (int at = 0; shown != nullptr && at < shown->num_of_certs; ++at) {
        for (const curl_slist* line = shown->certinfo[at]; line != nullptr; line = line->next) {
            if (const std::string_view text = line->data; text.starts_with(kCertificate)) {
                pem += text.substr(kCertificate.size());
                pem += pem.ends_with('\n') ? "" : "\n";
            }
        }
    }
}
