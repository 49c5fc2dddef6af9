// SPDX-License-Identifier: Apache-2.0
//
// Test double of the platform's events, recordings and pacing. The picture of frame 7 is "P7", its time 70 ms.
#include "platform/recording/event.h"
#include "platform/recording/jpegextractor.h"
#include "platform/recording/pacing.h"
#include "test/support/platform/record.h"

using lookhaven::test::Call;
using lookhaven::test::Script;

namespace lookhaven::test {

Event MakeEvent(int id, int start, int end, int rec_method) {
    Event event;
    event.m_Id = id;
    event.m_StartTm = start;
    event.m_EndTm = end;
    event.m_RecMethod = rec_method;
    event.m_blSaved = true;
    event.m_FullPath = "/rec/" + std::to_string(id);
    event.m_AudFmt = "AAC";
    return event;
}

}  // namespace lookhaven::test

namespace {

int Find(const char* call, int eventId, int mountId, int serverId, int archiveId, Event& event) {
    Call(call, eventId, mountId, serverId, archiveId);
    const auto found = Script().events.find(eventId);
    if (found == Script().events.end()) {
        return -1;
    }
    event = found->second;
    return 0;
}

}  // namespace

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
    return Find("Event::Load", eventId, mountId, serverId, archiveId, *this);
}
// A getter that returns its field.
#define GETTER(type, name, field)                                                                                      \
    type Event::name() const {                                                                                         \
        return field;                                                                                                  \
    }
GETTER(std::string, GetFullPath, m_FullPath)
GETTER(int, GetId, m_Id)
GETTER(std::string, GetPath, m_Path)
GETTER(int, GetStartTm, m_StartTm)
GETTER(int, GetEndTm, m_EndTm)
GETTER(int, GetFrameCount, m_FrameCount)
GETTER(int, GetVdoType, m_VdoType)
GETTER(int, GetRecMethod, m_RecMethod)
GETTER(std::string, GetAudFmt, m_AudFmt)
GETTER(int, GetImgW, m_ImgW)
GETTER(int, GetImgH, m_ImgH)
GETTER(bool, GetRecording, m_blRecording)
GETTER(bool, GetArchived, m_blArchived)
GETTER(std::uint64_t, GetSize, m_Size)
GETTER(bool, IsSaved, m_blSaved)
#undef GETTER
int Event::GetIdOnRecServer() const {
    return m_Id + 1000;
}
bool Event::IsOriginalView() const {
    return m_CamId == 8;  // the fisheye camera
}
int AlertEvent::Load(int eventId, int mountId, int serverId, int archiveId) {
    return Find("AlertEvent::Load", eventId, mountId, serverId, archiveId, *this);
}
PosEvent::PosEvent() = default;
int PosEvent::Load(int eventId, int mountId, int serverId, int archiveId) {
    return Find("PosEvent::Load", eventId, mountId, serverId, archiveId, m_Footage);
}
bool PosEvent::IsSaved() const {
    return m_Footage.IsSaved();
}
std::string PosEvent::GetFullPath() const {
    return m_Footage.GetFullPath();
}
int DoEventTimelyPlay(const Event& event, REC_EVENT_TYPE type) {
    return Call("DoEventTimelyPlay", event.m_Id, type), Script().timely_play_result;
}
bool IsFileExist(const std::string& path) {
    return Call("IsFileExist", path), Script().has_file && !path.empty();
}

struct JpegExtractor::Recording {};
JpegExtractor::JpegExtractor() = default;
JpegExtractor::~JpegExtractor() = default;
int JpegExtractor::Init(const std::string& path) {
    return Call("Init", path), Script().init_result;
}
int JpegExtractor::GetFrameInfo(__tag_JPEG_FRAME_INFO& info) {
    info = {Script().frame_rate, Script().frame_count};
    return Call("GetFrameInfo"), Script().frame_info_result;
}
int JpegExtractor::ReadFrame(int index, unsigned char* buffer, int& length) {
    Call("ReadFrame", index, length);
    if (index < 0 || index >= Script().frame_count + Script().grown_by || Script().broken_frames.count(index) != 0) {
        return -1;
    }
    length = static_cast<int>(("P" + std::to_string(index)).copy(reinterpret_cast<char*>(buffer), 16));
    return 0;
}
int JpegExtractor::GetFrameIdx(int timeMs) {
    return Call("GetFrameIdx", timeMs), timeMs < 0 ? -1 : timeMs / 10;
}
int JpegExtractor::GetTimeMS(int index) {
    return index * 10;
}

DelayTimer::DelayTimer(int delayUs) : m_DelayUs(delayUs), m_DueUs(0) {
    Call("DelayTimer", delayUs);
}
void DelayTimer::SetDelayTime(int delayUs) {
    Call("SetDelayTime", delayUs);
}
void DelayTimer::BeginTiming() {
    Call("BeginTiming");
}
void DelayTimer::Delay() {
    Call("Delay");
}

struct ProgressIndicator::Channel {};
ProgressIndicator::ProgressIndicator(long long key, bool create, bool owner) {
    Call("ProgressIndicator", key, create, owner);
}
ProgressIndicator::~ProgressIndicator() = default;
int ProgressIndicator::Set(int value) {
    return Call("Set", value), Script().progress_result;
}
int ProgressIndicator::Get() {
    return Call("Get"), Script().client_number;
}
