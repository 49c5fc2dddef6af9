// SPDX-License-Identifier: Apache-2.0
//
// The multipart answer: response head, parts with their heads, boundaries.
//
// Format        The boundary follows each part at once, not only before the next: a browser shows a part when it has
//               seen its end.
#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <string>

#include "platform/output/multipartresponse.h"
#include "standalone/base/clock.h"
#include "standalone/base/text.h"
#include "standalone/binding/request_context.h"

namespace {

using lookhaven::binding::Output;
using lookhaven::binding::RequestContext;

// Appends decimal digits, without printf: a stream does this for every picture.
void AppendNumber(std::string& text, std::int64_t number, int width = 1) {
    std::array<char, 24> digits;
    const auto end = std::to_chars(digits.data(), digits.data() + digits.size(), number).ptr;
    text.append(static_cast<std::size_t>(std::max<std::int64_t>(0, width - (end - digits.data()))), '0');
    text.append(digits.data(), end);
}

void AppendResponseHead(std::string& head, const std::string& boundary) {
    head.append("Content-Type: multipart/x-mixed-replace; boundary=").append(boundary);
    head.append("\r\nCache-Control: no-store\r\nX-Accel-Buffering: no\r\n\r\n--").append(boundary).append("\r\n");
}

void AppendCaptureTime(std::string& head, std::int64_t captured_ms) {
    AppendNumber(head.append("X-Capture-Time: "), captured_ms / 1000);
    AppendNumber(head.append("."), captured_ms % 1000, 3);
    head.append("\r\n");
}

// Capture time and age when the data lies in the ring entry that is being read; the capture time when it is the
// recorded picture that was read last; else nothing.
void AppendPictureLines(std::string& head, const void* data, const RequestContext& context) {
    const lookhaven::ring::Entry* entry = context.HeldEntry();
    const auto* byte = static_cast<const unsigned char*>(data);
    if (entry != nullptr && byte >= entry->Data() && byte <= entry->Data() + entry->length) {
        AppendCaptureTime(head, entry->CaptureMillis());
        AppendNumber(head.append("X-Age-Ms: "), lookhaven::base::WallMillis() - entry->CaptureMillis());
        head.append("\r\n");
    } else if (data != nullptr && data == context.LastRecorded().data) {
        AppendCaptureTime(head, context.LastRecorded().captured_ms);
    }
}

std::string Base64(const unsigned char* data, int length) {
    if (data == nullptr || length <= 0 || static_cast<std::size_t>(length) > lookhaven::ring::kMaxExtraBytes) {
        return "";
    }
    return lookhaven::base::ToBase64({reinterpret_cast<const char*>(data), static_cast<std::size_t>(length)});
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
    // Kept, so that a stream allocates nothing per part.
    static std::string head;
    head.clear();
    if (!m_blHeadSent) {
        AppendResponseHead(head, output->Boundary());
    }
    AppendNumber(head.append("Content-Type: ").append(contentType).append("\r\nContent-Length: "), length);
    AppendPictureLines(head.append("\r\n"), data, context);
    head.append(extra == nullptr ? "" : extra).append("\r\n");
    static std::string tail;
    tail.assign("\r\n--").append(output->Boundary()).append("\r\n");
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
