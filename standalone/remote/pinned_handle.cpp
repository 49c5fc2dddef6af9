// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/pinned_handle.h"

#include "standalone/remote/certificate.h"

namespace lookhaven::remote {

PinnedHandle::List PinnedHandle::ListOf(const std::vector<std::string>& lines) {
    List list(nullptr, ::curl_slist_free_all);
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

PinnedHandle::PinnedHandle(const Host& host, const std::string& query, const std::vector<std::string>& headers)
    : headers_(ListOf(headers)),
      handle_(::curl_easy_init(), ::curl_easy_cleanup) {
    if (!handle_) {
        throw std::bad_alloc();
    }
    const std::string name = CertificateName(host.certificate);
    const std::string port = std::to_string(host.port);
    const bool is_ipv6 = host.address.find(':') != std::string::npos;
    const std::string address = is_ipv6 ? "[" + host.address + "]" : host.address;
    connect_to_ = ListOf({name + ":" + port + ":" + address + ":" + port});
    curl_blob certificate{const_cast<char*>(host.certificate.data()), host.certificate.size(), CURL_BLOB_COPY};
    Set(CURLOPT_URL, ("https://" + name + ":" + port + "/webapi?" + query).c_str());
    Set(CURLOPT_CONNECT_TO, connect_to_.get());
    Set(CURLOPT_HTTPHEADER, headers_.get());
    Set(CURLOPT_HTTP_VERSION, static_cast<long>(CURL_HTTP_VERSION_1_1));
    Set(CURLOPT_PROTOCOLS_STR, "https");
    Set(CURLOPT_NOPROXY, "*");
    Set(CURLOPT_NOSIGNAL, 1L);
    Set(CURLOPT_QUICK_EXIT, 1L);  // does not wait for a resolver that hangs
    Set(CURLOPT_SSLVERSION, static_cast<long>(CURL_SSLVERSION_TLSv1_2));
    Set(CURLOPT_CAINFO_BLOB, &certificate);
    Set(CURLOPT_CAPATH, static_cast<const char*>(nullptr));
    Set(CURLOPT_ERRORBUFFER, problem_.data());
}

long PinnedHandle::Status() const {
    long status = 0;
    ::curl_easy_getinfo(handle_.get(), CURLINFO_RESPONSE_CODE, &status);
    return status;
}

std::string PinnedHandle::ContentType() const {
    const char* type = nullptr;
    ::curl_easy_getinfo(handle_.get(), CURLINFO_CONTENT_TYPE, &type);
    return type == nullptr ? "" : type;
}

std::int64_t PinnedHandle::SizeBytes() const {
    curl_off_t size = -1;
    ::curl_easy_getinfo(handle_.get(), CURLINFO_CONTENT_LENGTH_DOWNLOAD_T, &size);
    return size;
}

std::string PinnedHandle::Header(const char* name) const {
    curl_header* header = nullptr;
    const bool is_there = ::curl_easy_header(handle_.get(), name, 0, CURLH_HEADER, -1, &header) == CURLHE_OK;
    return is_there ? header->value : "";
}

void PinnedHandle::ThrowNoAnswer(CURLcode result) const {
    if (result == CURLE_PEER_FAILED_VERIFICATION) {
        throw WrongCertificate("its certificate is not the one that it was paired with, or has expired");
    }
    throw NoAnswer(problem_[0] != '\0' ? problem_.data() : ::curl_easy_strerror(result), Status());
}

}  // namespace lookhaven::remote
