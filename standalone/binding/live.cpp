// SPDX-License-Identifier: Apache-2.0
//
// Live streams: who may attach a ring, how long attaching waits, and the ring's calls under the platform's names.
#include <algorithm>
#include <array>
#include <chrono>
#include <csignal>
#include <cstddef>
#include <optional>
#include <span>

#include <time.h>

#include "platform/admission/host.h"
#include "platform/live/livestream.h"
#include "standalone/base/clock.h"
#include "standalone/binding/live_ring.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/binding/slow_viewer.h"
#include "standalone/control/demand.h"
#include "standalone/ring/reader.h"
#include "standalone/store/cameras.h"

namespace base = lookhaven::base;
namespace binding = lookhaven::binding;
namespace control = lookhaven::control;
namespace ring = lookhaven::ring;
namespace store = lookhaven::store;
using lookhaven::base::MonotonicMicros;
using lookhaven::binding::MayUse;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;

static_assert(sizeof(DataEntry) == sizeof(ring::Entry));
static_assert(offsetof(DataEntry, m_Length) == offsetof(ring::Entry, length));
static_assert(offsetof(DataEntry, m_SeqNo) == offsetof(ring::Entry, sequence));
static_assert(offsetof(DataEntry, m_Offset) == offsetof(ring::Entry, offset));
static_assert(offsetof(DataEntry, m_Flags) == offsetof(ring::Entry, flags));
static_assert(offsetof(DataEntry, m_TimestampLow) == offsetof(ring::Entry, timestamp_low));
static_assert(DATA_ENTRY_KEY_FRAME == ring::kKeyFrame && DATA_ENTRY_SEQ_NONE == ring::kNoSequence);
static_assert(sizeof(__tag_DATA_ENTRY_INFO) == sizeof(ring::Position));
static_assert(alignof(__tag_DATA_ENTRY_INFO) == alignof(ring::Position));
static_assert(offsetof(__tag_DATA_ENTRY_INFO, m_Reader) == offsetof(ring::Position, reader));
static_assert(offsetof(__tag_DATA_ENTRY_INFO, m_Pinned) == offsetof(ring::Position, pinned));
static_assert(offsetof(__tag_DATA_ENTRY_INFO, m_Generation) == offsetof(ring::Position, generation));

namespace {

// The sound that this process reads beside its picture; without a position until the module begins to read it.
ring::SecondReader g_sound;
bool g_is_silent = false;  // none will ever come

constexpr std::chrono::seconds kMaxAttach{5};
constexpr long kAttachPollNanos = 10'000'000;

ring::Position* Inner(__tag_DATA_ENTRY_INFO* position) {
    return reinterpret_cast<ring::Position*>(position);
}

DataEntry* Held(const ring::Entry* entry) {
    RequestContext::Current().SetHeldEntry(entry);
    return reinterpret_cast<DataEntry*>(const_cast<ring::Entry*>(entry));
}

// The recorder has replaced the ring by a new one: its reader ends, so that the client reconnects at once instead of
// after a time-out.
void EndReaderOfRetired(const void* stream) {
    if (ring::IsRetired(stream)) {
        std::raise(SIGTERM);
    }
}

void CopyExtraData(const void* stream, unsigned char* data, int& length) {
    const std::span<const unsigned char> extra = ring::ExtraData(stream);
    const bool fits = static_cast<int>(extra.size()) <= length;
    length = fits ? static_cast<int>(extra.size()) : 0;
    std::copy_n(extra.data(), length, data);
}

bool HasStream(store::Store& records, int camera_id, int stream) {
    const std::optional<store::Camera> camera = store::Cameras(records).Find(camera_id);
    return camera && camera->enabled && camera->FindProfile(stream) != nullptr;
}

// Waits for a ring with a frame of this start; null when none comes in time, the recorder dies or a signal arrives.
void* AttachRunning(const base::Installation& installation, control::LiveStream wanted,
                    std::chrono::microseconds limit) {
    control::Demand demand(installation);
    const ring::StreamId id{wanted.camera, wanted.stream, base::Medium::kVideo};
    void* stream = nullptr;
    for (const std::int64_t start = MonotonicMicros();;) {
        if (stream == nullptr) {
            stream = ring::Attach(installation, id);
        }
        if (stream != nullptr && !ring::IsRetired(stream) && ring::HasFrameOfThisStart(stream)) {
            return stream;
        }
        if (stream != nullptr && ring::IsRetired(stream)) {
            ring::Detach(stream);
            stream = nullptr;
        }
        demand.Request(wanted);
        const timespec pause{0, kAttachPollNanos};
        if (MonotonicMicros() - start > limit.count() || !IsLHRunning() || ::nanosleep(&pause, nullptr) != 0) {
            break;
        }
    }
    if (stream != nullptr) {
        ring::Detach(stream);
    }
    return nullptr;
}

void* AttachGranted(RequestContext& context, control::LiveStream stream, bool may_hear) {
    context.GrantStream(stream, may_hear);
    context.CloseRecords();
    return AttachRunning(context.Installation(), stream, kMaxAttach);
}

}  // namespace

namespace lookhaven::binding {

ShmStreamFifo* AttachLiveRing(control::LiveStream stream) {
    RequestContext& context = RequestContext::Current();
    if (!IsLHRunning() || !HasStream(context.Records(), stream.camera, stream.stream)) {
        return nullptr;
    }
    return static_cast<ShmStreamFifo*>(AttachGranted(context, stream, true));
}

bool AwaitLiveRing(control::LiveStream stream, std::chrono::microseconds limit) {
    void* const found =
        IsLHRunning() ? AttachRunning(RequestContext::Current().Installation(), stream, limit) : nullptr;
    if (found != nullptr) {
        ring::Detach(found);
    }
    return found != nullptr;
}

}  // namespace lookhaven::binding

ShmStreamFifo* LiveStreamFifoAt(int camId, int streamNo) {
    RequestContext& context = RequestContext::Current();
    context.NotePicture();
    void* stream = OrFailure<void*>("LiveStreamFifoAt", nullptr, [&]() -> void* {
        if (!MayUse(camId, store::CameraAccess::kLive)) {
            context.NoteHidden();
            return nullptr;
        }
        if (!IsLHRunning() || !HasStream(context.Records(), camId, streamNo)) {
            return nullptr;
        }
        return AttachGranted(context, {camId, streamNo}, MayUse(camId, store::CameraAccess::kAudio));
    });
    return static_cast<ShmStreamFifo*>(stream);
}

// The recorder makes the ring of the sound before the first picture, so there is nothing to wait for.
ShmStreamFifo* LiveAdoStreamFifoAt(int camId, int streamNo) {
    const RequestContext& context = RequestContext::Current();
    void* stream = OrFailure<void*>("LiveAdoStreamFifoAt", nullptr, [&]() -> void* {
        if (context.GrantedStream() != control::LiveStream{camId, streamNo}) {
            return nullptr;
        }
        const ring::StreamId id{camId, streamNo, base::Medium::kAudio};
        void* sound = context.MayHear() ? ring::Attach(context.Installation(), id) : nullptr;
        g_is_silent = sound == nullptr;
        g_sound = {g_is_silent ? ring::AttachEmpty(id, {}) : sound, nullptr};
        return g_sound.ring;
    });
    return static_cast<ShmStreamFifo*>(stream);
}

void ShmStreamFifo::StartRead(__tag_DATA_ENTRY_INFO* position) {
    if (position != nullptr) {
        ring::StartRead(this, Inner(position));
        if (this == g_sound.ring) {
            g_sound.position = Inner(position);
        }
    }
}

DataEntry* ShmStreamFifo::ReadLatest() {
    return Held(ring::ReadLatest(this));
}

DataEntry* ShmStreamFifo::ReadLatest(int lastSeq, __tag_DATA_ENTRY_INFO* position) {
    EndReaderOfRetired(this);
    return Held(binding::ReadLatestPicture(this, lastSeq, Inner(position)));
}

DataEntry* ShmStreamFifo::ReadNext(int lastSeq, __tag_DATA_ENTRY_INFO* position) {
    EndReaderOfRetired(this);
    if (ring::MediumOf(this) != base::Medium::kVideo) {
        return Held(binding::ReadNextSound(this, lastSeq, Inner(position)));
    }
    const ring::SecondReader sound = g_is_silent ? ring::SecondReader{} : g_sound;
    return Held(
        binding::ReadNextPicture(this, lastSeq, Inner(position), g_sound.position != nullptr ? &sound : nullptr));
}

DataEntry* ShmStreamFifo::ReadLatestIFrame() {
    return Held(ring::ReadLatestIFrame(this));
}

void ShmStreamFifo::ReadIFrameFinish(DataEntry* entry, __tag_DATA_ENTRY_INFO* position) {
    ReadFinish(entry, true, position);
}

void ShmStreamFifo::ReadFinish(DataEntry* entry, bool, __tag_DATA_ENTRY_INFO* position) {
    RequestContext::Current().SetHeldEntry(nullptr);
    ring::ReadFinish(this, reinterpret_cast<const ring::Entry*>(entry), Inner(position));
}

void ShmStreamFifo::StopRead(__tag_DATA_ENTRY_INFO* position) {
    RequestContext::Current().SetHeldEntry(nullptr);
    ring::StopRead(this, Inner(position));
    if (this == g_sound.ring) {
        g_sound = {};
        g_is_silent = false;
    }
}

void ShmStreamFifo::GetVdoExtraData(unsigned char* data, int& length) {
    CopyExtraData(this, data, length);
}

void ShmStreamFifo::GetAdoExtraData(unsigned char* data, int& length) {
    CopyExtraData(this, data, length);
}

const char* ShmStreamFifo::GetVdoCodec() {
    return ring::Codec(this);
}

const char* ShmStreamFifo::GetAdoCodec() {
    return ring::Codec(this);
}

LiveStreamUpdater::LiveStreamUpdater(int camId, int streamNo) : m_CamId(camId), m_StreamNo(streamNo) {}

void LiveStreamUpdater::StartLive() {
    UpdateStamp();
}

// Only for the stream that the caller has been granted: a request alone must not start a camera that the caller may not
// see. Attaching requests the stream by itself.
void LiveStreamUpdater::UpdateStamp() {
    OrFailure("LiveStreamUpdater", 0, [&] {
        const RequestContext& context = RequestContext::Current();
        const control::LiveStream stream{m_CamId, m_StreamNo};
        if (context.GrantedStream() == stream) {
            static control::Demand demand(context.Installation());
            demand.Request(stream);
        }
        return 0;
    });
}
