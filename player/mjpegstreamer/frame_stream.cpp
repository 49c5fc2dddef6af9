// SPDX-License-Identifier: Apache-2.0
//
// Common to both ways of playback: opens the recording, reads and sends pictures, paces them, checks the session.
#include "player/mjpegstreamer/frame_stream.h"

#include <algorithm>
#include <cstdio>
#include <cstdlib>
#include <cstring>
#include <limits>

#include "player/mjpegstreamer/mjpegstreamer.h"
#include "player/mjpegstreamer/player_session.h"
#include "player/wrapped.h"

namespace {

constexpr int kBufferSize = 2097152;
constexpr int kNoNumber = -1;

// Truncates toward zero; what does not fit becomes the nearest int, NaN becomes 0.
int Truncate(double number) {
    constexpr std::numeric_limits<int> kInt;
    return number >= kInt.max()   ? kInt.max()
           : number <= kInt.min() ? kInt.min()
           : number == number     ? static_cast<int>(number)
                                  : 0;
}

}  // namespace

void FrameStream::Free::operator()(void* memory) const {
    std::free(memory);
}

FrameStream::FrameStream(long long timestamp) : m_Progress(timestamp, true, true), m_Timer(0) {}

bool FrameStream::Open(const std::string& path) {
    if (m_Extractor.Init(path) != 0 || m_Extractor.GetFrameInfo(m_Info) != 0 || m_Info.m_FrameRate == 0.0F) {
        return false;
    }
    m_pBuffer.reset(static_cast<unsigned char*>(std::malloc(kBufferSize)));
    if (!m_pBuffer) {
        LH_TRACE_AT(LOG_CATEG_PLAYER, LOG_LEVEL_ERR, kMjpegStreamerSource, __LINE__, "StreamOut",
                    "Alloc buffer failed!\n");
    }
    return m_pBuffer != nullptr;
}

int FrameStream::GetLastIndex() const {
    return Wrapped(std::int64_t{m_Info.m_FrameCount} - 1);
}

bool FrameStream::Read(int index) {
    m_Length = kBufferSize;
    return m_Extractor.ReadFrame(index, m_pBuffer.get(), m_Length) == 0;
}

void FrameStream::SendIndex(int index) {
    char text[32];
    std::snprintf(text, sizeof text, "%d\r\n", index);
    m_Multipart.Write("text/plain", text, static_cast<int>(std::strlen(text)), nullptr);
    fflush(stdout);
}

void FrameStream::SendPicture() {
    m_Multipart.Write("image/jpeg", m_pBuffer.get(), m_Length, nullptr);
    fflush(stdout);
}

void FrameStream::StartPace(int playRate, int interval) {
    SetRate(playRate);
    m_Timer.BeginTiming();
    m_blPaced = interval < 0;
    m_Step = interval >= 1 ? Wrapped(std::int64_t{interval} * Truncate(m_Info.m_FrameRate)) : 1;
}

void FrameStream::FollowRate() {
    const int rate = m_Progress.Get();
    if (rate != m_Rate && rate != kNoNumber) {
        SetRate(rate);
    }
}

bool FrameStream::IsSessionGone() const {
    return g_PlayerCheckPid != 0 && CheckPlayerPidFile() != 0;
}

int FrameStream::NextStride() {
    if (!m_blPaced) {
        return m_Step;
    }
    m_Timer.Delay();
    return std::max(m_Rate, 1);
}

void FrameStream::SetRate(int rate) {
    const int periodUs = Truncate(1000000.0 / static_cast<double>(m_Info.m_FrameRate));
    // A faster rate keeps the period and skips frames.
    m_Timer.SetDelayTime(rate < 0 ? Wrapped(-std::int64_t{periodUs} * rate) : periodUs);
    m_Rate = rate;
}
