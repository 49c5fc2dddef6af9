// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/fetch.h"

#include "standalone/remote/library.h"
#include "standalone/remote/transfer.h"

namespace lookhaven::remote {

namespace {

constexpr std::string_view kLiveViews[] = {"multipart/x-mixed-replace", "image/jpeg"};
constexpr std::string_view kJson[] = {"application/json"};
constexpr std::size_t kMaxJsonBytes = 1 << 20;
constexpr std::chrono::seconds kMaxJsonDuration{10};

bool Fetch(const Host& host, const Request& request, const Expected& expected, Sink& sink) {
    return reinterpret_cast<decltype(&LookhavenFetch)>(FindInLibrary("LookhavenFetch"))(host, request, expected, sink);
}

class Text : public Sink {
  public:
    bool Begin(std::string_view, std::int64_t) override { return true; }
    bool Write(std::span<const char> bytes) override {
        text.append(bytes.begin(), bytes.end());
        return text.size() <= kMaxJsonBytes;
    }
    bool WantsMore() override { return true; }

    std::string text;
};

}  // namespace

void FetchLiveView(const Host& host, const Request& request, Sink& sink) {
    Fetch(host, request, {kLiveViews, {}}, sink);
}

std::string FetchJson(const Host& host, const Request& request) {
    Text sink;
    if (!Fetch(host, request, {kJson, kMaxJsonDuration}, sink)) {
        throw NoAnswer("its answer is cut off or too long");
    }
    return std::move(sink.text);
}

std::string FetchCertificates(const std::string& address, int port) {
    std::string pem;
    reinterpret_cast<decltype(&LookhavenFetchCertificates)>(FindInLibrary("LookhavenFetchCertificates"))(address, port,
                                                                                                         pem);
    return pem;
}

}  // namespace lookhaven::remote
