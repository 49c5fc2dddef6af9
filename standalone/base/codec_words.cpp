// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/codec_words.h"

#include "standalone/base/text.h"

namespace lookhaven::base {

std::string CodecWord(Codec codec) {
    return LowerAscii(CodecName(codec));
}

const Names<Codec>& VideoCodecWords() {
    static const Names<Codec> words = [] {
        Names<Codec> all;
        for (const Codec codec : {Codec::kMjpeg, Codec::kH264, Codec::kH265}) {
            all.emplace(CodecWord(codec), codec);
        }
        return all;
    }();
    return words;
}

std::string CodecTitle(Codec codec) {
    std::string title = CodecName(codec);
    return title.starts_with("H26") ? title.insert(1, ".") : title;
}

}  // namespace lookhaven::base
