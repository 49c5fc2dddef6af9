// SPDX-License-Identifier: Apache-2.0
//
// A host that answers with given bytes whatever libcurl asks, for the one source file of a program that includes this.
//
// Why so        There is no network and no TLS, which both belong to libraries: a connection is a local pair of sockets
//               with the answer waiting in it, and the address is one of plain HTTP.
#pragma once

#include <string>
#include <string_view>

#include <curl/curl.h>
#include <dlfcn.h>
#include <sys/socket.h>
#include <unistd.h>

#include "standalone/base/file.h"
#include "standalone/remote/certificate.h"

namespace lookhaven::test {

inline std::string_view answer;  // of the next connection
inline base::FileDescriptor answering_host;

}  // namespace lookhaven::test

std::string lookhaven::remote::CertificateName(const std::string&) {
    return "host";
}

// These stand in for those of the libraries.
extern "C" __attribute__((visibility("default"))) int connect(int descriptor, const sockaddr*, socklen_t) {
    namespace test = lookhaven::test;
    int pair[2];
    if (::socketpair(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK, 0, pair) != 0) {
        return -1;
    }
    const lookhaven::base::FileDescriptor near(pair[0]);
    test::answering_host.Reset(pair[1]);
    ::send(pair[1], test::answer.data(), test::answer.size(), MSG_DONTWAIT);
    ::shutdown(pair[1], SHUT_WR);
    return ::dup2(near.Get(), descriptor) < 0 ? -1 : 0;
}

// Declared by its label, since what has a variable number of arguments cannot pass them on.
extern "C" CURLcode SetOption(CURL* handle, CURLoption option, void* value) __asm__("curl_easy_setopt");
CURLcode SetOption(CURL* handle, CURLoption option, void* value) {
    static const auto real =
        reinterpret_cast<CURLcode (*)(CURL*, CURLoption, ...)>(::dlsym(RTLD_NEXT, "curl_easy_setopt"));
    if (option == CURLOPT_URL) {
        std::string url = static_cast<const char*>(value);
        return real(handle, option, url.erase(url.find('s'), 1).c_str());
    }
    return real(handle, option, option == CURLOPT_PROTOCOLS_STR ? "http" : value);
}
