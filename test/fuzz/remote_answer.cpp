// SPDX-License-Identifier: Apache-2.0
//
// Answers with any bytes in the place of a paired host: a live view must begin once, with a type that may be passed on,
// and a list must be one of cameras or be refused.
#include "standalone/remote/camera_list.h"
#include "standalone/remote/transfer.h"
#include "test/fuzz/fuzz.h"
#include "test/support/answering_host.h"

using namespace lookhaven;

namespace {

constexpr std::string_view kLiveViews[] = {"multipart/x-mixed-replace", "image/jpeg"};
constexpr std::string_view kJson[] = {"application/json"};

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

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const bool is_list = input.Take<std::uint8_t>() % 2 == 0;
    test::answer = fuzz::Text(input.Rest());
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
