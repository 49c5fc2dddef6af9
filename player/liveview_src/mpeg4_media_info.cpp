// SPDX-License-Identifier: Apache-2.0
//
// Reads the description of a stream from its rings.
#include "player/liveview_src/mpeg4_media_info.h"

void Mpeg4MediaInfo::Update(ShmStreamFifo* video, ShmStreamFifo* audio) {
    m_VdoExtraLen = kMaxExtraLen;
    video->GetVdoExtraData(m_VdoExtra, m_VdoExtraLen);
    m_AdoExtraLen = kMaxExtraLen;
    audio->GetAdoExtraData(m_AdoExtra, m_AdoExtraLen);
    m_Codecs = video->GetVdoCodec();
    m_Codecs.append(";").append(audio->GetAdoCodec());
    m_VdoContentType = std::string("image/") + video->GetVdoCodec();
    m_AdoContentType = std::string("audio/") + audio->GetAdoCodec();
}
