// SPDX-License-Identifier: Apache-2.0
//
// A camera's video in its own codec together with its audio, as one endless multipart stream.
//
// Why so        A decoder can only begin at a key frame, so nothing is sent before one: the newest at once if the ring
//               has it, otherwise the first that arrives. From then on every frame is sent, since each needs the
//               previous.
#include <cstdio>

#include <sys/shm.h>

#include "platform/live/livestream.h"
#include "platform/output/multipartresponse.h"
#include "player/liveview_src/live_loop.h"
#include "player/liveview_src/liveview_src.h"
#include "player/liveview_src/mpeg4_media_info.h"

namespace {

// The function that the log lines name.
constexpr char kFunc[] = "LiveviewMpeg4Cam";

long long Timestamp(const DataEntry& entry) {
    return static_cast<long long>((std::uint64_t{entry.m_TimestampHigh} << 32) | entry.m_TimestampLow);
}

// The two rings, and how far each has been sent.
class MuxedStream {
  public:
    MuxedStream(MultipartResponse& multipart, const LiveLoop& loop, ShmStreamFifo* video, ShmStreamFifo* audio)
        : m_Multipart(multipart),
          m_Loop(loop),
          m_pVideo(video),
          m_pAudio(audio) {
        m_pVideo->StartRead(&m_VideoPosition);
        m_pAudio->StartRead(&m_AudioPosition);
    }

    void SendNewestKeyFrame();
    // Each reads one entry; true when it was sent.
    bool PassVideo();
    bool PassAudio();
    // Stops reading and detaches both rings.
    void Close();

  private:
    void Write(const std::string& contentType, const DataEntry& entry);

    MultipartResponse& m_Multipart;
    const LiveLoop& m_Loop;
    ShmStreamFifo* m_pVideo;
    ShmStreamFifo* m_pAudio;
    __tag_DATA_ENTRY_INFO m_VideoPosition;
    __tag_DATA_ENTRY_INFO m_AudioPosition;
    Mpeg4MediaInfo m_Info;
    int m_VideoSeq = DATA_ENTRY_SEQ_NONE;
    int m_AudioSeq = DATA_ENTRY_SEQ_NONE;
    bool m_blHeadSent = false;  // a key frame has been sent
};

void MuxedStream::SendNewestKeyFrame() {
    DataEntry* entry = m_pVideo->ReadLatestIFrame();
    if (entry != nullptr && IsFrameSizeInRange(*entry)) {
        m_VideoSeq = entry->m_SeqNo;
        m_Info.Update(m_pVideo, m_pAudio);
        Write(m_Info.m_VdoContentType, *entry);
        fflush(stdout);
        LH_TRACE_AT(LOG_CATEG_LIVEVIEW, LOG_LEVEL_INFO, kLiveviewSource, __LINE__, kFunc,
                    "Flush latest i-frame. [FrameSize: %d]\n", FrameSize(*entry));
        m_blHeadSent = true;
    }
    m_pVideo->ReadIFrameFinish(entry, nullptr);
}

bool MuxedStream::PassVideo() {
    bool wrote = false;
    DataEntry* entry = m_pVideo->ReadNext(m_VideoSeq, &m_VideoPosition);
    if (entry != nullptr && IsFrameSizeInRange(*entry)) {
        m_VideoSeq = entry->m_SeqNo;
        const bool isKeyFrame = (entry->m_Flags & DATA_ENTRY_KEY_FRAME) != 0;
        if (m_blHeadSent || isKeyFrame) {
            if (!m_blHeadSent) {
                m_Info.Update(m_pVideo, m_pAudio);
            }
            Write(m_Info.m_VdoContentType, *entry);
            LH_TRACE_AT(LOG_CATEG_LIVEVIEW, LOG_LEVEL_DEBUG, kLiveviewSource, __LINE__, kFunc,
                        "Flush video frame. [FrameSize: %d]\n", FrameSize(*entry));
            m_Loop.Flush();
            wrote = m_blHeadSent = true;
        }
    }
    m_pVideo->ReadFinish(entry, true, &m_VideoPosition);
    return wrote;
}

bool MuxedStream::PassAudio() {
    bool wrote = false;
    DataEntry* entry = m_pAudio->ReadNext(m_AudioSeq, &m_AudioPosition);
    if (entry != nullptr && IsFrameSizeInRange(*entry)) {
        m_AudioSeq = entry->m_SeqNo;
        if (m_blHeadSent) {
            Write(m_Info.m_AdoContentType, *entry);
            fflush(stdout);
            LH_TRACE_AT(LOG_CATEG_LIVEVIEW, LOG_LEVEL_DEBUG, kLiveviewSource, __LINE__, kFunc,
                        "Flush latest audio. [FrameSize: %d]\n", FrameSize(*entry));
            wrote = true;
        }
    }
    // The platform wants true for video and false for audio.
    m_pAudio->ReadFinish(entry, false, &m_AudioPosition);
    return wrote;
}

void MuxedStream::Close() {
    m_pVideo->StopRead(&m_VideoPosition);
    m_pAudio->StopRead(&m_AudioPosition);
    shmdt(m_pVideo);
    shmdt(m_pAudio);
}

void MuxedStream::Write(const std::string& contentType, const DataEntry& entry) {
    m_Multipart.Write(contentType.c_str(), m_Info.m_Codecs.c_str(), m_Info.m_VdoExtra, m_Info.m_VdoExtraLen,
                      m_Info.m_AdoExtra, m_Info.m_AdoExtraLen, Timestamp(entry), FrameData(entry), FrameSize(entry),
                      nullptr);
}

}  // namespace

void LiveviewSrcHandler::LiveviewMpeg4Cam(int camId, int streamNo) {
    MultipartResponse multipart;
    LiveLoop loop(camId, __func__);
    LiveStreamUpdater updater(camId, streamNo);
    updater.StartLive();
    ShmStreamFifo* video = LiveStreamFifoAt(camId, streamNo);
    if (video == nullptr) {
        LH_LOG(kLiveviewSource, "Cam[%d]: Failed to attach live stream [%d].\n", camId, streamNo);
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return;
    }
    ShmStreamFifo* audio = LiveAdoStreamFifoAt(camId, streamNo);
    if (audio == nullptr) {
        LH_LOG(kLiveviewSource, "Cam[%d]: Failed to attach live audio stream [%d].\n", camId, streamNo);
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return;
    }
    MuxedStream stream(multipart, loop, video, audio);
    stream.SendNewestKeyFrame();
    while (loop.BeginPass()) {
        updater.UpdateStamp();
        bool wrote = stream.PassVideo();
        if (gblStop != 0) {
            break;
        }
        wrote = stream.PassAudio() || wrote;
        if (wrote) {
            loop.NoteWrite();  // no sleep while there is something to send
        } else if (!loop.Rest()) {
            break;
        }
    }
    loop.LogExit();
    stream.Close();
    m_pResponse->SetEnableOutput(false);
}
