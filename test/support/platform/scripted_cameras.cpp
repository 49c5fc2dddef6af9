// SPDX-License-Identifier: Apache-2.0
//
// Test double of the platform's cameras, live streams and multipart output.
#include <algorithm>
#include <cstdio>
#include <cstring>

#include "platform/camera/devcap.h"
#include "platform/live/livestream.h"
#include "platform/output/multipartresponse.h"
#include "test/support/platform/record.h"

using lookhaven::test::AudioRing;
using lookhaven::test::Call;
using lookhaven::test::Script;
using lookhaven::test::ScriptedFrame;
using lookhaven::test::ScriptedFrames;
using lookhaven::test::Sound;

namespace lookhaven::test {

Camera MakeCamera(int id, int video_type, bool enabled) {
    Camera camera;
    camera.m_Id = id;
    std::snprintf(camera.m_szName, sizeof camera.m_szName, "cam%d", id);
    camera.m_VideoType = video_type;
    camera.m_blEnabled = enabled;
    camera.m_LiveProfile = CAM_PROFILE_LOW;
    return camera;
}

ShmStreamFifo* AudioRing() {
    static char segment;
    return reinterpret_cast<ShmStreamFifo*>(&segment);
}

}  // namespace lookhaven::test

Camera::Camera()
    : m_Id(0),
      m_szName{},
      m_blEnabled(false),
      m_VideoType(0),
      m_LiveProfile(0),
      m_StreamNo{},
      m_AudioType(CAM_AUDIO_NONE),
      m_DeviceType(CAM_DEVICE_UNKNOWN) {}
int Camera::Load(int camId, int serverId, int archiveId) {
    Call("Load", camId, serverId, archiveId);
    const auto found = Script().cameras.find(camId);
    if (found == Script().cameras.end()) {
        return -1;
    }
    *this = found->second;
    return 0;
}
CAM_PROFILE_TYPE Camera::GetLiveProfile() const {
    return Call("GetLiveProfile"), static_cast<CAM_PROFILE_TYPE>(m_LiveProfile);
}
int Camera::GetUiStreamNo(CAM_PROFILE_TYPE profile) const {
    return Call("GetUiStreamNo", profile), 10 * m_Id + profile;
}
std::string Camera::GetStoragePath() const {
    return "/cam" + std::to_string(m_Id);
}

std::list<Camera> GetCamLocalList(bool onlyEnabled, const std::string& groupIds, const std::string& deniedIds,
                                  bool withDeleted, bool withRemote) {
    Call("GetCamLocalList", onlyEnabled, groupIds, deniedIds, withDeleted, withRemote);
    return Script().camera_list;
}
int GetLoginPort() {
    return Call("GetLoginPort"), Script().login_port;
}

namespace {

struct SoundFunctor : MemFuncInterface<unsigned int, NoneT, NoneT, NoneT, NoneT, NoneT, NoneT, NoneT> {
    explicit SoundFunctor(unsigned int result) : m_Result(result) {}
    unsigned int operator()(DPObjectBase&) override { return Call("SoundSupport"), m_Result; }
    unsigned int m_Result;
};

}  // namespace

DPObjectBase::~DPObjectBase() = default;
MemFuncBase::~MemFuncBase() = default;
DevCapHandler::DevCapHandler() = default;
DevCapHandler::~DevCapHandler() = default;
int DevCapHandler::LoadByCam(const Camera& camera) {
    Call("LoadByCam", camera.m_Id);
    const Sound sound = Script().sound[camera.m_Id];
    m_pDevice = std::make_unique<DPObjectBase>();
    // Not 1, to tell a truth value from a number that is passed on.
    m_pSoundSupport = std::make_unique<SoundFunctor>(sound == Sound::kYes ? 2 : 0);
    if (sound == Sound::kWrongType) {
        m_pSoundSupport = std::make_unique<MemFuncBase>();
    }
    m_SoundSupport.m_pTarget = sound == Sound::kNoTarget ? nullptr : m_pDevice.get();
    m_SoundSupport.m_pFunctor = sound == Sound::kNoFunctor ? nullptr : m_pSoundSupport.get();
    m_SoundSupport.m_Name = "Sound";
    return Script().cap_failures.count(camera.m_Id) != 0 ? -1 : 0;
}
unsigned int CamCapUtils::GetLiveStmPtzCapByUserName(const DevCapHandler&, const Camera& camera,
                                                     const std::string& userName) {
    Call("GetLiveStmPtzCapByUserName", camera.m_Id, userName);
    return 0x80000000U + static_cast<unsigned int>(camera.m_Id);
}

LHShmCommonCfg* LHShmCommonCfgAt() {
    return Script().has_common_cfg ? &Script().common_cfg : nullptr;
}
long GetMonoTimeSec() {
    return Script().monotonic_now;
}

ShmStreamFifo* LiveStreamFifoAt(int camId, int streamNo) {
    static char segment;
    Call("LiveStreamFifoAt", camId, streamNo);
    return Script().has_stream ? reinterpret_cast<ShmStreamFifo*>(&segment) : nullptr;
}
ShmStreamFifo* LiveAdoStreamFifoAt(int camId, int streamNo) {
    Call("LiveAdoStreamFifoAt", camId, streamNo);
    return Script().has_audio_stream ? AudioRing() : nullptr;
}

namespace {

// Records the call; the name of one on the audio ring begins with "audio".
template <typename... Arguments>
void RingCall(const ShmStreamFifo* ring, const std::string& name, const Arguments&... arguments) {
    Call((ring == AudioRing() ? "audio " + name : name).c_str(), arguments...);
}

std::string NameOf(const __tag_DATA_ENTRY_INFO* position) {
    const auto found = Script().positions.find(position);
    return found == Script().positions.end() ? "stray position" : found->second;
}

const char* NameOf(const DataEntry* entry) {
    return entry == nullptr ? "null" : "entry";
}

DataEntry* Entry(const std::optional<ScriptedFrame>& frame) {
    if (!frame) {
        return nullptr;
    }
    const auto length = frame->length < 0 ? frame->data.size() : static_cast<std::size_t>(frame->length);
    auto& memory = Script().entries.emplace_back((sizeof(DataEntry) + length) / sizeof(std::uint32_t) + 1);
    auto* entry = reinterpret_cast<DataEntry*>(memory.data());
    entry->m_Length = static_cast<int>(length);
    entry->m_SeqNo = frame->seq;
    entry->m_Offset = frame->offset;
    entry->m_Flags = 0xfffffffdU | (frame->is_key ? DATA_ENTRY_KEY_FRAME : 0);
    entry->m_TimestampLow = static_cast<std::uint32_t>(frame->timestamp);
    entry->m_TimestampHigh = static_cast<std::uint32_t>(frame->timestamp >> 32);
    std::memcpy(entry + 1, frame->data.data(), std::min(length, frame->data.size()));
    return entry;
}

DataEntry* NextOf(ScriptedFrames& frames) {
    if (frames.empty()) {
        return nullptr;
    }
    const auto frame = frames.front();
    frames.pop_front();
    return Entry(frame);
}

DataEntry* NextPicture() {
    Script().is_eof = Script().is_eof || Script().frames.empty();
    return NextOf(Script().frames);
}

void Give(const std::string& extra, unsigned char* data, int& length) {
    length = static_cast<int>(extra.copy(reinterpret_cast<char*>(data), static_cast<std::size_t>(length)));
}

}  // namespace

void ShmStreamFifo::StartRead(__tag_DATA_ENTRY_INFO* position) {
    Script().positions.emplace(position, this == AudioRing() ? "audio position" : "position");
    RingCall(this, "StartRead", NameOf(position));
}
DataEntry* ShmStreamFifo::ReadLatest() {
    return RingCall(this, "ReadLatest"), NextPicture();
}
DataEntry* ShmStreamFifo::ReadLatest(int lastSeq, __tag_DATA_ENTRY_INFO* position) {
    return RingCall(this, "ReadLatest", lastSeq, NameOf(position)), NextPicture();
}
DataEntry* ShmStreamFifo::ReadNext(int lastSeq, __tag_DATA_ENTRY_INFO* position) {
    RingCall(this, "ReadNext", lastSeq, NameOf(position));
    return this == AudioRing() ? NextOf(Script().audio_frames) : NextPicture();
}
DataEntry* ShmStreamFifo::ReadLatestIFrame() {
    return RingCall(this, "ReadLatestIFrame"), Entry(Script().newest_key_frame);
}
void ShmStreamFifo::ReadIFrameFinish(DataEntry* entry, __tag_DATA_ENTRY_INFO* position) {
    RingCall(this, "ReadIFrameFinish", NameOf(entry), NameOf(position));
}
void ShmStreamFifo::ReadFinish(DataEntry* entry, bool flag, __tag_DATA_ENTRY_INFO* position) {
    RingCall(this, "ReadFinish", NameOf(entry), flag, NameOf(position));
}
void ShmStreamFifo::StopRead(__tag_DATA_ENTRY_INFO* position) {
    RingCall(this, "StopRead", NameOf(position));
    Script().positions.erase(position);
}
void ShmStreamFifo::GetVdoExtraData(unsigned char* data, int& length) {
    RingCall(this, "GetVdoExtraData", length);
    Give(Script().video_extra, data, length);
}
void ShmStreamFifo::GetAdoExtraData(unsigned char* data, int& length) {
    RingCall(this, "GetAdoExtraData", length);
    Give(Script().audio_extra, data, length);
}
const char* ShmStreamFifo::GetVdoCodec() {
    return this == AudioRing() ? "wrong ring" : Script().video_codec.c_str();
}
const char* ShmStreamFifo::GetAdoCodec() {
    return this == AudioRing() ? Script().audio_codec.c_str() : "wrong ring";
}

LiveStreamUpdater::LiveStreamUpdater(int camId, int streamNo) : m_CamId(camId), m_StreamNo(streamNo) {}
void LiveStreamUpdater::StartLive() {
    Call("StartLive", m_CamId, m_StreamNo);
}
void LiveStreamUpdater::UpdateStamp() {
    Call("UpdateStamp");
}

MultipartResponse::MultipartResponse() : m_blHeadSent(false) {}
int MultipartResponse::Write(const char* contentType, const void* data, int length, const char* extra) {
    const std::string text(static_cast<const char*>(data), length < 100 ? static_cast<std::size_t>(length) : 0);
    Call("Write", contentType, data == nullptr ? "null" : text, length, extra == nullptr ? "null" : extra);
    m_blHeadSent = true;
    return Script().write_result;
}
int MultipartResponse::Write(const char* contentType, const char* codecs, const unsigned char* videoExtra,
                             int videoExtraLength, const unsigned char* audioExtra, int audioExtraLength,
                             long long timestamp, const void* data, int length, const char* extra) {
    const auto text = [](const void* bytes, int count) {
        return std::string(static_cast<const char*>(bytes), count < 100 ? static_cast<std::size_t>(count) : 0);
    };
    Call("Write", contentType, codecs, text(videoExtra, videoExtraLength), text(audioExtra, audioExtraLength),
         timestamp, text(data, length), length, extra == nullptr ? "null" : extra);
    return Script().write_result;
}
