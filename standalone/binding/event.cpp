// SPDX-License-Identifier: Apache-2.0
//
// Recorded events, alerts and POS transactions as the store has them, of cameras that the caller may play back.
#include "platform/recording/event.h"

#include <algorithm>
#include <filesystem>
#include <limits>

#include "standalone/binding/event_record.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/control/flush_request.h"
#include "standalone/media/libav_libraries.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"

namespace base = lookhaven::base;
namespace store = lookhaven::store;
using lookhaven::binding::MayUse;
using lookhaven::binding::OrFailure;
using lookhaven::binding::RequestContext;

static_assert(static_cast<int>(store::MarkKind::kAlert) == REC_EVENT_ALERT);
static_assert(static_cast<int>(store::MarkKind::kPos) == REC_EVENT_POS);
static_assert(base::kReasonContinuous == REC_METHOD_CONTINUOUS && base::kReasonAlarm == REC_METHOD_ALARM);

namespace {

// The platform's seconds are 32-bit and end in 2038.
int Narrow(std::int64_t seconds) {
    return static_cast<int>(std::clamp<std::int64_t>(seconds, 0, std::numeric_limits<int>::max()));
}

std::string FullPath(const std::string& mount, const std::string& path) {
    return path.empty() || mount.empty() ? std::string() : mount + '/' + path;
}

std::string MountPath(int mount_id) {
    const auto mount = store::Mounts(RequestContext::Current().Records()).Find(mount_id);
    return mount ? mount->path : std::string();
}

// False when there is no such mark or the caller may not see its camera.
bool LoadMark(Event& event, store::MarkKind kind, int id) {
    const auto mark = store::Marks(RequestContext::Current().Records()).Find(kind, id);
    if (!mark || !MayUse(mark->camera_id, store::CameraAccess::kPlayback)) {
        return false;
    }
    event = Event();
    event.m_Id = mark->id;
    event.m_CamId = mark->camera_id;
    event.m_StartTm = Narrow(mark->start_s);
    event.m_EndTm = Narrow(mark->end_s);
    event.m_RecMethod = REC_METHOD_ALARM;
    event.m_Path = mark->path;
    event.m_FullPath = FullPath(MountPath(mark->mount_id), mark->path);
    event.m_blSaved = mark->state == store::MarkState::kSaved && !mark->demo;
    return true;
}

}  // namespace

namespace lookhaven::binding {

Event PlatformEvent(const store::Event& from, const std::string& mount_path) {
    Event to;
    to.m_Id = from.id;
    to.m_CamId = from.camera_id;
    to.m_StartTm = Narrow(from.start_s);
    to.m_EndTm = Narrow(from.end_s);
    to.m_FrameCount = from.frame_count;
    to.m_VdoType = static_cast<int>(from.video_type);
    to.m_RecMethod = from.reason;
    to.m_ImgW = from.width;
    to.m_ImgH = from.height;
    to.m_blSaved = !from.demo;
    to.m_blRecording = from.recording;
    to.m_blArchived = from.kept;
    to.m_Size = static_cast<std::uint64_t>(from.size_bytes);
    to.m_Path = from.path;
    to.m_FullPath = FullPath(mount_path, from.path);
    to.m_AudFmt = from.audio_codec;
    return to;
}

}  // namespace lookhaven::binding

Event::Event()
    : m_Id(0),
      m_CamId(0),
      m_StartTm(0),
      m_EndTm(0),
      m_FrameCount(0),
      m_VdoType(0),
      m_RecMethod(0),
      m_ImgW(0),
      m_ImgH(0),
      m_blSaved(false),
      m_blRecording(false),
      m_blArchived(false),
      m_Size(0) {}

int Event::Load(int eventId, int mountId, int serverId, int archiveId) {
    return OrFailure("Event::Load", -1, [&] {
        const auto event = store::Events(RequestContext::Current().Records()).Find(eventId);
        const bool fits = event && serverId == 0 && archiveId == 0 && (mountId == 0 || mountId == event->mount_id);
        if (!fits || !MayUse(event->camera_id, store::CameraAccess::kPlayback)) {
            return -1;
        }
        if (event->video_type != base::Codec::kMjpeg) {
            lookhaven::media::BeginLoadingDecoderLibrary();  // an event is loaded to be played
        }
        *this = lookhaven::binding::PlatformEvent(*event, MountPath(event->mount_id));
        return 0;
    });
}

bool Event::IsSaved() const {
    return m_blSaved;
}

std::string Event::GetFullPath() const {
    return m_blSaved ? m_FullPath : std::string();
}

int Event::GetId() const {
    return m_Id;
}

int Event::GetIdOnRecServer() const {
    return 0;
}

std::string Event::GetPath() const {
    return m_Path;
}

int Event::GetStartTm() const {
    return m_StartTm;
}

int Event::GetEndTm() const {
    return m_EndTm;
}

int Event::GetFrameCount() const {
    return m_FrameCount;
}

int Event::GetVdoType() const {
    return m_VdoType;
}

int Event::GetRecMethod() const {
    return m_RecMethod;
}

std::string Event::GetAudFmt() const {
    return m_AudFmt;
}

int Event::GetImgW() const {
    return m_ImgW;
}

int Event::GetImgH() const {
    return m_ImgH;
}

bool Event::GetRecording() const {
    return m_blRecording;
}

bool Event::GetArchived() const {
    return m_blArchived;
}

std::uint64_t Event::GetSize() const {
    return m_Size;
}

// The cameras of this host have no fisheye lenses.
bool Event::IsOriginalView() const {
    return false;
}

int AlertEvent::Load(int eventId, int mountId, int serverId, int archiveId) {
    const bool own = mountId == 0 && serverId == 0 && archiveId == 0;
    return OrFailure("AlertEvent::Load", -1,
                     [&] { return own && LoadMark(*this, store::MarkKind::kAlert, eventId) ? 0 : -1; });
}

PosEvent::PosEvent() = default;

int PosEvent::Load(int eventId, int mountId, int serverId, int archiveId) {
    const bool own = mountId == 0 && serverId == 0 && archiveId == 0;
    return OrFailure("PosEvent::Load", -1,
                     [&] { return own && LoadMark(m_Footage, store::MarkKind::kPos, eventId) ? 0 : -1; });
}

bool PosEvent::IsSaved() const {
    return m_Footage.IsSaved();
}

std::string PosEvent::GetFullPath() const {
    return m_Footage.GetFullPath();
}

int DoEventTimelyPlay(const Event& event, REC_EVENT_TYPE type) {
    return OrFailure("DoEventTimelyPlay", -1, [&] {
        RequestContext& context = RequestContext::Current();
        context.CloseRecords();
        const bool flushed =
            type == REC_EVENT_RECORDED && lookhaven::control::FlushRequests(context.Installation()).Ask(event.GetId());
        return flushed ? 0 : -1;
    });
}

bool IsFileExist(const std::string& path) {
    std::error_code error;
    return std::filesystem::exists(path, error);
}
