// SPDX-License-Identifier: Apache-2.0
//
// What the simulated cameras send: the frames of three files.
#pragma once

#include <string>
#include <vector>

namespace bench {

// Frames in memory, to be sent over and over.
struct Footage {
    std::vector<std::vector<std::string>> video;  // NAL units of each frame
    std::vector<std::string> audio;
    std::string audio_config;  // hexadecimal
    std::string jpeg;
};

// An Annex B file of H.264 with access unit delimiters, an ADTS file of 48 kHz, and a JPEG file. Throws
// std::runtime_error for a file that cannot be read, std::out_of_range for one of another form.
Footage ReadFootage(const char* video, const char* audio, const char* picture);

}  // namespace bench
