// SPDX-License-Identifier: Apache-2.0
//
// libav objects that free themselves, its errors as exceptions, its log in ours.
#pragma once

#include <chrono>
#include <memory>
#include <stop_token>
#include <string>
#include <string_view>

extern "C" {
#include <libavcodec/avcodec.h>
#include <libavcodec/bsf.h>
#include <libavformat/avformat.h>
}

namespace lookhaven::media {

struct AvDeleter {
    void operator()(AVFormatContext* context) const { avformat_close_input(&context); }
    void operator()(AVIOContext* context) const { avio_closep(&context); }
    void operator()(AVCodecContext* context) const { avcodec_free_context(&context); }
    void operator()(AVBSFContext* context) const { av_bsf_free(&context); }
    void operator()(AVCodecParserContext* parser) const { av_parser_close(parser); }
    void operator()(AVPacket* packet) const { av_packet_free(&packet); }
    void operator()(AVFrame* frame) const { av_frame_free(&frame); }
};

template <class T>
using AvPtr = std::unique_ptr<T, AvDeleter>;

// A dictionary of options for libav, which removes those that it understands.
class AvOptions {
  public:
    AvOptions() = default;
    AvOptions(const AvOptions&) = delete;
    AvOptions& operator=(const AvOptions&) = delete;
    ~AvOptions() { av_dict_free(&dictionary_); }

    AvOptions& Set(const char* key, const std::string& value) {
        av_dict_set(&dictionary_, key, value.c_str(), 0);
        return *this;
    }
    AVDictionary** Get() { return &dictionary_; }

  private:
    AVDictionary* dictionary_ = nullptr;
};

// Throws SourceError "<what>: <libav's text>" when the result of a libav call is negative; else returns it.
int CheckAv(int result, std::string_view what);

// Takes ownership of what a libav allocation returned; throws std::bad_alloc for null.
template <class T>
AvPtr<T> OwnAv(T* object) {
    if (object == nullptr) {
        throw std::bad_alloc();
    }
    return AvPtr<T>(object);
}

// Why libav's TLS client last refused a certificate on this thread; empty when it did not. Forgets it.
std::string TakeCertificateProblem();

// Sends libav's log lines to ours, at debug level and without secrets: whatever matters is returned as an error too,
// and a broken camera would fill the log with a line per frame. Limits libav's single allocations to what a picture of
// base::kMaxSidePixels needs, whatever a camera claims. Only the first call in a process does anything.
void PrepareAv();

// Ends a blocking libav call on a stop request or when no picture came for too long.
//
// Why so        libav's own timeouts cover single reads, so a camera that sends a little now and then, or sound only,
//               would block a reader forever; and the error code of an interrupted call does not say why it ended.
class Deadline {
  public:
    Deadline(std::stop_token stop, std::chrono::milliseconds limit);
    Deadline(const Deadline&) = delete;
    Deadline& operator=(const Deadline&) = delete;

    // A picture came: the limit counts from now on.
    void Rearm();

    // Throws SourceError when stop was requested or the limit has passed.
    void Check() const;

    // The callback borrows this object for as long as libav holds it.
    AVIOInterruptCB Callback();

    const std::stop_token& Stop() const { return stop_; }

  private:
    bool IsPast() const;

    std::stop_token stop_;
    std::int64_t limit_us_;
    std::int64_t due_us_ = 0;
};

}  // namespace lookhaven::media
