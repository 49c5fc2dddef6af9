// SPDX-License-Identifier: Apache-2.0
//
// Answers with any bytes in the place of a paired host: a live view must begin once, with a type that may be passed on,
// and a list must be one of cameras or be refused.
//
// Why so        There is no network and no TLS, which both belong to libraries: a connection is a local pair of sockets
//               with the input waiting in it, and the address is one of plain HTTP.
#include <curl/curl.h>
#include <sys/socket.h>
#include <unistd.h>

#include <dlfcn.h>

#include "standalone/remote/camera_list.h"
#include "standalone/remote/certificate.h"
#include "standalone/remote/transfer.h"
#include "test/fuzz/fuzz.h"

using namespace lookhaven;

namespace {

constexpr std::string_view kLiveViews[] = {"multipart/x-mixed-replace", "image/jpeg"};
constexpr std::string_view kJson[] = {"application/json"};

std::string_view answer;
base::FileDescriptor host;

class Viewer : public remote::Sink {
  public:
    bool Begin(std::string_view content_type, std::int64_t size) override {
        fuzz::Require(!has_begun_ && size >= -1 && content_type.size() <= 200);
        fuzz::Require(std::ranges::all_of(content_type, [](char c) { return c >= ' ' && c <= '~'; }));
        return has_begun_ = true;
    }
    bool Write(std::span<const char> bytes) override {
        fuzz::Require(has_begun_);
        text.append(bytes.data(), bytes.size());
        return true;
    }
    bool WantsMore() override { return true; }

    std::string text;

  private:
    bool has_begun_ = false;
};

void ReadCameras(const std::string& text) {
    try {
        remote::CamerasInAnswer(text);
    } catch (const remote::NoAnswer&) {
    }
}

}  // namespace

// Certificates have a target of their own.
std::string remote::CertificateName(const std::string&) {
    return "host";
}

// These stand in for those of the libraries.
extern "C" __attribute__((visibility("default"))) int connect(int descriptor, const sockaddr*, socklen_t) {
    int pair[2];
    fuzz::Require(::socketpair(AF_UNIX, SOCK_STREAM | SOCK_NONBLOCK, 0, pair) == 0);
    const base::FileDescriptor near(pair[0]);
    host.Reset(pair[1]);
    ::send(pair[1], answer.data(), answer.size(), MSG_DONTWAIT);
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

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const bool is_list = input.Take<std::uint8_t>() % 2 == 0;
    answer = fuzz::Text(input.Rest());
    Viewer viewer;
    try {
        const remote::Expected expected{is_list ? std::span<const std::string_view>(kJson) : kLiveViews,
                                        std::chrono::seconds(5)};
        if (LookhavenFetch({"127.0.0.1", 1, ""}, {"api=a", "b=c"}, expected, viewer) && is_list) {
            ReadCameras(viewer.text);
        }
    } catch (const remote::NoAnswer&) {
        fuzz::Require(viewer.text.empty());
    }
    return 0;
}
