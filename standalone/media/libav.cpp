// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/libav.h"

#include <array>
#include <cerrno>
#include <mutex>
#include <utility>

#include "standalone/base/clock.h"
#include "standalone/base/log.h"
#include "standalone/media/jpeg.h"
#include "standalone/media/source.h"
#include "standalone/media/source_url.h"

extern "C" {
#include <libavutil/mem.h>
}

namespace lookhaven::media {

namespace {

// Twice the samples of a plane, because of padding.
constexpr std::size_t kMaxBlockBytes = std::size_t{2} * base::kMaxSidePixels * base::kMaxSidePixels;

// libav's error code says no more than "Input/output error" of these.
thread_local std::string certificate_problem;
thread_local bool is_host_unknown = false;

void WriteAvLog(void* object, int level, const char* format, va_list arguments) {
    if (level > AV_LOG_WARNING) {
        return;
    }
    std::array<char, 1024> line{};
    int print_prefix = 1;
    av_log_format_line2(object, level, format, arguments, line.data(), static_cast<int>(line.size()), &print_prefix);
    const std::string_view text(line.data());
    if (text.starts_with("[tls @") && text.find("certificate") != text.npos) {
        const std::size_t begin = text.find("] ") + 2;
        certificate_problem = text.substr(begin, text.find_last_not_of('\n') + 1 - begin);
    }
    is_host_unknown |= text.find("Failed to resolve hostname") != text.npos;
    base::Log(base::Severity::kDebug, RedactSecrets(text));
}

base::SignalLoss CauseOf(int error) {
    switch (error) {
    case AVERROR(ECONNREFUSED):
        return base::SignalLoss::kRefused;
    case AVERROR(EHOSTUNREACH):
    case AVERROR(ENETUNREACH):
    case AVERROR(ETIMEDOUT):
        return base::SignalLoss::kUnreachable;
    case AVERROR_HTTP_UNAUTHORIZED:
    case AVERROR_HTTP_FORBIDDEN:
        return base::SignalLoss::kWrongPassword;
    default:
        return base::SignalLoss::kOther;
    }
}

}  // namespace

int CheckAv(int result, std::string_view what) {
    const bool is_unresolved = std::exchange(is_host_unknown, false);
    if (result < 0) {
        if (result == AVERROR(EIO) && is_unresolved) {
            throw SourceError(std::string(what) + ": the host name cannot be resolved", base::SignalLoss::kUnknownHost);
        }
        std::array<char, AV_ERROR_MAX_STRING_SIZE> text{};
        av_strerror(result, text.data(), text.size());
        throw SourceError(std::string(what) + ": " + text.data(), CauseOf(result));
    }
    return result;
}

std::string TakeCertificateProblem() {
    return std::exchange(certificate_problem, {});
}

void PrepareAv() {
    static std::once_flag once;
    std::call_once(once, [] {
        av_log_set_callback(WriteAvLog);
        av_max_alloc(kMaxBlockBytes);
    });
}

Deadline::Deadline(std::stop_token stop, std::chrono::milliseconds limit)
    : stop_(std::move(stop)),
      limit_us_(std::chrono::microseconds(limit).count()) {
    Rearm();
}

void Deadline::Rearm() {
    due_us_ = base::MonotonicMicros() + limit_us_;
}

bool Deadline::IsPast() const {
    return base::MonotonicMicros() > due_us_;
}

void Deadline::Check() const {
    if (stop_.stop_requested()) {
        throw SourceError("stopped");
    }
    if (IsPast()) {
        throw SourceError("no picture for " + std::to_string(limit_us_ / 1000) + " ms", base::SignalLoss::kStalled);
    }
}

AVIOInterruptCB Deadline::Callback() {
    return {[](void* self) {
                const auto& deadline = *static_cast<const Deadline*>(self);
                return deadline.stop_.stop_requested() || deadline.IsPast() ? 1 : 0;
            },
            this};
}

}  // namespace lookhaven::media
