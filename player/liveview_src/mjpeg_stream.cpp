// SPDX-License-Identifier: Apache-2.0
//
// A camera's MJPEG picture: once, or as an endless multipart stream.
//
// Why so        Pictures go from shared memory to the output without a copy, and only the newest is sent, so that a
//               slow client skips pictures and never falls behind. On early returns the segment stays attached: the
//               process ends with the request.
#include <cstdio>

#include <sys/shm.h>

#include "platform/camera/camera.h"
#include "platform/live/livestream.h"
#include "platform/output/multipartresponse.h"
#include "player/liveview_src/live_loop.h"
#include "player/liveview_src/liveview_src.h"

namespace {

constexpr char kJpeg[] = "image/jpeg";

}  // namespace

void LiveviewSrcHandler::SnapshotMjpgCam(int camId) {
    Camera camera;
    if (camera.Load(camId, 0, 0) != 0) {
        LH_LOG(kLiveviewSource, "Failed to load camera [%d].\n", camId);
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return;
    }
    if (camera.m_VideoType != CAM_VIDEO_MJPEG) {
        LH_LOG(kLiveviewSource, "The video codec of cam[%d] NOT mjpg.\n", camId);
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return;
    }
    ShmStreamFifo* fifo = LiveStreamFifoAt(camId, camera.GetUiStreamNo(camera.GetLiveProfile()));
    if (fifo == nullptr) {
        LH_LOG(kLiveviewSource, "Failed to attach cam[%d] live stream buf\n", camId);
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return;
    }
    DataEntry* entry = fifo->ReadLatest();
    if (entry == nullptr) {
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return;
    }
    const int size = FrameSize(*entry);
    printf("Content-type: image/jpeg\r\nContent-length: %d\r\n\r\n", size);
    fwrite(FrameData(*entry), static_cast<std::size_t>(size), 1, stdout);
    fflush(stdout);
    fifo->ReadFinish(entry, false, nullptr);
    shmdt(fifo);
    m_pResponse->SetEnableOutput(false);
}

void LiveviewSrcHandler::LiveviewMjpgCam(int camId, int streamNo, bool fromPlugin) {
    MultipartResponse multipart;
    LiveLoop loop(camId, __func__);
    LiveStreamUpdater updater(camId, streamNo);
    updater.StartLive();
    ShmStreamFifo* fifo = LiveStreamFifoAt(camId, streamNo);
    if (fifo == nullptr) {
        LH_LOG(kLiveviewSource, "Cam[%d]: Failed to attach live stream [%d].\n", camId, streamNo);
        SetErrorCode(LH_WEBAPI_ERR_RESOURCE, "", "");
        return;
    }
    __tag_DATA_ENTRY_INFO position;
    fifo->StartRead(&position);
    if (fromPlugin) {
        multipart.Write(kJpeg, nullptr, 0, nullptr);
        fflush(stdout);
    }
    int lastSeq = DATA_ENTRY_SEQ_NONE;
    while (loop.BeginPass()) {
        updater.UpdateStamp();
        DataEntry* entry = fifo->ReadLatest(lastSeq, &position);
        if (entry != nullptr && IsFrameSizeInRange(*entry)) {
            lastSeq = entry->m_SeqNo;
            multipart.Write(kJpeg, FrameData(*entry), FrameSize(*entry), nullptr);
            LH_TRACE(LOG_CATEG_LIVEVIEW, LOG_LEVEL_DEBUG, kLiveviewSource, "Write frame [Cam: %d]\n", camId);
            loop.Flush();
            loop.NoteWrite();
        }
        fifo->ReadFinish(entry, true, &position);
        if (!loop.Rest()) {
            break;
        }
    }
    loop.LogExit();
    fifo->StopRead(&position);
    shmdt(fifo);
    m_pResponse->SetEnableOutput(false);
}
