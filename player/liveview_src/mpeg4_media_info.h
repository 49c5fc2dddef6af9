// SPDX-License-Identifier: Apache-2.0
//
// The description that every part of a muxed live stream carries: content types, codecs, decoder configuration.
#pragma once

#include <string>

#include "platform/live/livestream.h"

struct Mpeg4MediaInfo {
    static constexpr int kMaxExtraLen = 1024;

    // Reads everything from the two rings, whatever was there before.
    void Update(ShmStreamFifo* video, ShmStreamFifo* audio);

    // Begins with "image/", not "video/": players tell the media apart by that.
    std::string m_VdoContentType;
    std::string m_AdoContentType;
    std::string m_Codecs;  // video codec ";" audio codec
    int m_VdoExtraLen = kMaxExtraLen;
    int m_AdoExtraLen = kMaxExtraLen;
    unsigned char m_VdoExtra[kMaxExtraLen] = {};
    unsigned char m_AdoExtra[kMaxExtraLen] = {};
};
