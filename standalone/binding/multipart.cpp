// SPDX-License-Identifier: Apache-2.0
//
// The multipart answer: response head, parts with their heads, boundaries.
//
// Format        The boundary follows each part at once, not only before the next: a browser shows a part when it has
//               seen its end.
#include <array>
#include <cstdio>
#include <string>

#include <sodium.h>

#include "platform/output/multipartresponse.h"
#include "standalone/base/clock.h"
#include "standalone/binding/request_context.h"

namespace {

using lookhaven::binding::Output;
using lookhaven::binding::RequestContext;

std::string ResponseHead(const std::string& boundary) {
    return "Content-Type: multipart/x-mixed-replace; boundary=" + boundary +
           "\r\nCache-Control: no-store\r\nX-Accel-Buffering: no\r\n\r\n--" + boundary + "\r\n";
}

// Capture time and age when the data lies in the ring entry that is being read, else nothing.
std::string LiveLines(const void* data, const lookhaven::ring::Entry* entry) {
    const auto* byte = static_cast<const unsigned char*>(data);
    if (entry == nullptr || byte < entry->Data() || byte > entry->Data() + entry->length) {
        return "";
    }
    const long long captured = entry->CaptureMillis();
    std::array<char, 96> lines{};
    std::snprintf(lines.data(), lines.size(), "X-Capture-Time: %lld.%03d\r\nX-Age-Ms: %lld\r\n", captured / 1000,
                  static_cast<int>(captured % 1000), static_cast<long long>(lookhaven::base::WallMillis()) - captured);
    return lines.data();
}

std::string Base64(const unsigned char* data, int length) {
    if (data == nullptr || length <= 0 || static_cast<std::size_t>(length) > lookhaven::ring::kMaxExtraBytes) {
        return "";
    }
    const auto bytes = static_cast<std::size_t>(length);
    std::string text(sodium_base64_ENCODED_LEN(bytes, sodium_base64_VARIANT_ORIGINAL), '\0');
    sodium_bin2base64(text.data(), text.size(), data, bytes, sodium_base64_VARIANT_ORIGINAL);
    text.pop_back();  // the terminating zero
    return text;
}

}  // namespace

MultipartResponse::MultipartResponse() : m_blHeadSent(false) {
    RequestContext::Current().NoteStream();
}

int MultipartResponse::Write(const char* contentType, const void* data, int length, const char* extra) {
    RequestContext& context = RequestContext::Current();
    Output* output = context.output();
    if (output == nullptr || length < 0 || (data == nullptr && length != 0)) {
        return -1;
    }
    context.CloseRecords();
    std::string head = m_blHeadSent ? "" : ResponseHead(output->Boundary());
    head.append("Content-Type: ").append(contentType).append("\r\nContent-Length: ").append(std::to_string(length));
    head.append("\r\n").append(LiveLines(data, context.HeldEntry()));
    head.append(extra == nullptr ? "" : extra).append("\r\n");
    std::string tail = "\r\n--" + output->Boundary() + "\r\n";
    m_blHeadSent = true;
    std::array<iovec, 3> pieces{{{head.data(), head.size()},
                                 {const_cast<void*>(data), static_cast<std::size_t>(length)},
                                 {tail.data(), tail.size()}}};
    return output->Send(pieces) ? 0 : -1;
}

int MultipartResponse::Write(const char* contentType, const char* codecs, const unsigned char* videoExtra,
                             int videoExtraLength, const unsigned char* audioExtra, int audioExtraLength,
                             long long timestamp, const void* data, int length, const char* extra) {
    std::string lines = "X-Codecs: ";
    lines.append(codecs).append("\r\nX-Video-Extra: ").append(Base64(videoExtra, videoExtraLength));
    lines.append("\r\nX-Audio-Extra: ").append(Base64(audioExtra, audioExtraLength));
    lines.append("\r\nX-Timestamp: ").append(std::to_string(timestamp)).append("\r\n");
    lines.append(extra == nullptr ? "" : extra);
    return Write(contentType, data, length, lines.c_str());
}
