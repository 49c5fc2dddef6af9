// SPDX-License-Identifier: Apache-2.0
//
// Puts any credentials into any URL of a camera: nothing of them may be left in what is logged.
#include "standalone/media/source_url.h"

#include "test/fuzz/fuzz.h"

using namespace lookhaven;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const std::string url(input.TakeUntil("\n"));
    media::RedactSecrets(fuzz::Text(input.Rest()));
    const media::SourceOpener opener = media::FindKind(media::CameraKinds(), url);
    const std::string secret = "Secret" + std::string(fuzz::Text(input.Take(20)));
    try {
        if (opener != nullptr && url.find("Secret") == url.npos) {
            const std::string full = media::WithCredentials(url, {secret, secret});
            fuzz::Require(media::RedactSecrets("cannot open " + full).find("Secret") == full.npos);
        }
    } catch (const media::SourceError&) {
    }
    return 0;
}
