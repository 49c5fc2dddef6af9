// SPDX-License-Identifier: Apache-2.0
#include "standalone/camera/messages.h"

#include <cstring>
#include <string_view>

namespace lookhaven::camera {

namespace {

void AppendBytes(std::vector<std::uint8_t>& bytes, const void* from, std::size_t size) {
    const std::size_t at = bytes.size();
    bytes.resize(at + size);
    if (size > 0) {
        std::memcpy(bytes.data() + at, from, size);
    }
}

template <class T>
void AppendNumber(std::vector<std::uint8_t>& bytes, const T& value) {
    AppendBytes(bytes, &value, sizeof value);
}

void AppendText(std::vector<std::uint8_t>& bytes, std::string_view text) {
    AppendNumber(bytes, static_cast<std::uint32_t>(text.size()));
    AppendBytes(bytes, text.data(), text.size());
}

template <class T>
T TakeNumber(std::span<const std::uint8_t>& bytes) {
    T value{};
    if (bytes.size() < sizeof value) {
        throw media::SourceError("the request is cut off");
    }
    std::memcpy(&value, bytes.data(), sizeof value);
    bytes = bytes.subspan(sizeof value);
    return value;
}

std::string TakeText(std::span<const std::uint8_t>& bytes) {
    const auto size = TakeNumber<std::uint32_t>(bytes);
    if (bytes.size() < size) {
        throw media::SourceError("the request is cut off");
    }
    std::string text(reinterpret_cast<const char*>(bytes.data()), size);
    bytes = bytes.subspan(size);
    return text;
}

}  // namespace

std::vector<std::uint8_t> EncodeFormat(const media::StreamFormat& format) {
    std::vector<std::uint8_t> bytes;
    AppendNumber(bytes, FormatBody{static_cast<std::int32_t>(format.codec), format.width, format.height,
                                   format.sample_rate_hz, format.channels});
    AppendBytes(bytes, format.extra_data.data(), format.extra_data.size());
    return bytes;
}

std::vector<std::uint8_t> EncodeRequest(const Request& request) {
    std::vector<std::uint8_t> bytes;
    AppendNumber(bytes, static_cast<std::int64_t>(request.options.no_data_limit.count()));
    AppendNumber(bytes, static_cast<std::uint8_t>(request.options.insecure));
    AppendText(bytes, request.url);
    AppendText(bytes, request.options.credentials.user);
    AppendText(bytes, request.options.credentials.password);
    return bytes;
}

Request DecodeRequest(std::span<const std::uint8_t> bytes) {
    Request request;
    request.options.no_data_limit = std::chrono::milliseconds(TakeNumber<std::int64_t>(bytes));
    request.options.insecure = TakeNumber<std::uint8_t>(bytes) != 0;
    request.url = TakeText(bytes);
    request.options.credentials.user = TakeText(bytes);
    request.options.credentials.password = TakeText(bytes);
    if (!bytes.empty()) {
        throw media::SourceError("the request is too long");
    }
    return request;
}

}  // namespace lookhaven::camera
