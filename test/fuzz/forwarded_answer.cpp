// SPDX-License-Identifier: Apache-2.0
//
// Answers with any bytes in the place of another host of the store: what is passed on begins once, with a head that no
// client can read as more than one.
#include "standalone/remote/forward.h"
#include "test/fuzz/fuzz.h"
#include "test/support/answering_host.h"

using namespace lookhaven;

namespace {

bool IsOneLine(std::string_view text) {
    return text.size() <= 1'000 && std::ranges::all_of(text, [](char c) { return c >= ' ' && c <= '~'; });
}

class Client : public remote::AnswerSink {
  public:
    bool Begin(const remote::AnswerHead& head) override {
        fuzz::Require(!has_begun && head.status >= 200 && head.status <= 599 && head.size_bytes >= -1);
        fuzz::Require(head.status < 300 || head.status >= 400 || head.status == 302 || head.status == 304);
        fuzz::Require(IsOneLine(head.content_type) && IsOneLine(head.location));
        fuzz::Require(head.location.empty() || (head.status == 302 && head.location.starts_with('/') &&
                                                !head.location.starts_with("//") && !head.location.starts_with("/\\")));
        fuzz::Require(head.headers.size() <= 6);
        for (const auto& [name, value] : head.headers) {
            fuzz::Require(IsOneLine(value) && name != "Set-Cookie");
        }
        has_begun = true;
        return true;
    }
    bool Write(std::span<const char>) override {
        fuzz::Require(has_begun);
        return true;
    }
    bool WantsMore() override { return true; }

    bool has_begun = false;
};

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    test::answer = fuzz::Text({data, size});
    remote::ForwardedRequest request{.query = "api=a", .headers = {"Cookie: __Host-id=c"}, .json = "{}"};
    request.max_head_wait = std::chrono::seconds(5);
    Client client;
    try {
        remote::Finish(
            *std::unique_ptr<remote::Forwarding>(LookhavenBeginForward({"127.0.0.1", 1, ""}, request, client)));
        fuzz::Require(client.has_begun);
    } catch (const remote::NoAnswer&) {
        fuzz::Require(!client.has_begun);
    }
    return 0;
}
