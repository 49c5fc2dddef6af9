// SPDX-License-Identifier: Apache-2.0
//
// Why so        A player that samples, and one at the end of its range, asks for the last picture again and again
//               without a pause. So a repeated index is answered from memory, and not sooner than 200 ms after the
//               last.
#include "platform/recording/jpegextractor.h"

#include <algorithm>
#include <cmath>
#include <span>
#include <vector>

#include <time.h>

#include "standalone/archive/recording_reader.h"
#include "standalone/base/clock.h"
#include "standalone/binding/huge_pages.h"
#include "standalone/binding/request_context.h"
#include "standalone/media/picture_reader.h"

namespace archive = lookhaven::archive;
using lookhaven::base::MonotonicMicros;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;

namespace {

constexpr std::int64_t kRepeatUs = 200'000;
constexpr std::int64_t kTailWaitUs = 2'000'000;
constexpr std::int64_t kTailPollUs = 20'000;
constexpr float kMinFramesPerSecond = 1.0F;
constexpr float kMaxFramesPerSecond = 1000.0F;

// False when a signal came first.
bool SleepUntil(std::int64_t due_us) {
    const timespec due{due_us / 1'000'000, static_cast<long>(due_us % 1'000'000 * 1'000)};
    return ::clock_nanosleep(CLOCK_MONOTONIC, TIMER_ABSTIME, &due, nullptr) == 0;
}

}  // namespace

struct JpegExtractor::Recording {
    explicit Recording(const std::string& path) : frames(path), pictures(frames) {}

    bool AwaitTail(int& index);
    std::size_t Read(int index, std::span<std::uint8_t> buffer);
    std::size_t Repeat(int index, std::span<std::uint8_t> buffer);

    archive::RecordingReader frames;
    lookhaven::media::PictureReader pictures;
    int last_index = -1;
    std::int64_t answered_us = 0;
    std::vector<std::uint8_t> repeated;  // the picture of last_index once it was asked for again; else empty
};

// Waits for the frame of an index that is past the end. A signal ends the wait with the newest frame instead, so
// that a player which is being paused does not end.
bool JpegExtractor::Recording::AwaitTail(int& index) {
    const std::int64_t until_us = MonotonicMicros() + kTailWaitUs;
    while (index >= frames.FrameCount()) {
        if (!frames.Grows() || MonotonicMicros() > until_us) {
            return false;
        }
        const bool undisturbed = SleepUntil(MonotonicMicros() + kTailPollUs);
        frames.Refresh();
        if (!undisturbed) {
            index = std::min(index, frames.FrameCount() - 1);
        }
    }
    return index >= 0;
}

std::size_t JpegExtractor::Recording::Repeat(int index, std::span<std::uint8_t> buffer) {
    if (repeated.empty()) {
        const std::size_t size = pictures.Read(index, buffer);
        repeated.assign(buffer.begin(), buffer.begin() + static_cast<std::ptrdiff_t>(size));
        return size;
    }
    SleepUntil(answered_us + kRepeatUs);
    if (repeated.size() > buffer.size()) {
        throw archive::ArchiveError("a picture does not fit");
    }
    std::copy(repeated.begin(), repeated.end(), buffer.begin());
    return repeated.size();
}

std::size_t JpegExtractor::Recording::Read(int index, std::span<std::uint8_t> buffer) {
    if (index < 0 || (index >= frames.FrameCount() && !AwaitTail(index))) {
        return 0;
    }
    std::size_t size = 0;
    if (index == last_index) {
        size = Repeat(index, buffer);
    } else {
        repeated.clear();
        size = pictures.Read(index, buffer);
        last_index = index;
    }
    answered_us = MonotonicMicros();
    return size;
}

JpegExtractor::JpegExtractor() = default;
JpegExtractor::~JpegExtractor() {
    RequestContext::Current().SetLastRecorded({});
}

int JpegExtractor::Init(const std::string& path) {
    return OrFailure("JpegExtractor::Init", -1, [&] {
        RequestContext::Current().CloseRecords();
        lookhaven::binding::PrepareForManyObjects();
        m_pRecording = std::make_unique<Recording>(path);
        return 0;
    });
}

int JpegExtractor::GetFrameInfo(__tag_JPEG_FRAME_INFO& info) {
    return m_pRecording == nullptr ? -1 : OrFailure("JpegExtractor::GetFrameInfo", -1, [&] {
        const auto rate = static_cast<float>(m_pRecording->frames.FrameRate());
        if (!std::isfinite(rate)) {
            return -1;
        }
        info.m_FrameRate = std::clamp(rate, kMinFramesPerSecond, kMaxFramesPerSecond);
        info.m_FrameCount = m_pRecording->frames.FrameCount();
        return 0;
    });
}

int JpegExtractor::ReadFrame(int index, unsigned char* buffer, int& length) {
    return m_pRecording == nullptr || length <= 0 ? -1 : OrFailure("JpegExtractor::ReadFrame", -1, [&] {
        const std::size_t size = m_pRecording->Read(index, {buffer, static_cast<std::size_t>(length)});
        if (size == 0) {
            return -1;
        }
        length = static_cast<int>(size);
        RequestContext::Current().SetLastRecorded({buffer, m_pRecording->frames.CapturedMs(m_pRecording->last_index)});
        return 0;
    });
}

int JpegExtractor::GetFrameIdx(int timeMs) {
    return m_pRecording == nullptr ? -1 : m_pRecording->frames.IndexAt(timeMs);
}

int JpegExtractor::GetTimeMS(int index) {
    return m_pRecording == nullptr ? 0 : static_cast<int>(m_pRecording->frames.TimeOf(index));
}
