// SPDX-License-Identifier: Apache-2.0
//
// What every part of a muxed live stream says about the stream: content types, codecs, decoder configuration.
#pragma once

#include <string>

#include "platform/live/livestream.h"

struct Mpeg4MediaInfo {
    static constexpr int kMaxExtraLen = 1024;

    // Reads everything anew from the two rings.
    void Update(ShmStreamFifo* video, ShmStreamFifo* audio);

    // "image/" stands before the video codec too: players tell the media apart by it.
    std::string m_VdoContentType;
    std::string m_AdoContentType;
    std::string m_Codecs;  // video codec ";" audio codec
    int m_VdoExtraLen = kMaxExtraLen;
    int m_AdoExtraLen = kMaxExtraLen;
    unsigned char m_VdoExtra[kMaxExtraLen] = {};
    unsigned char m_AdoExtra[kMaxExtraLen] = {};
};
