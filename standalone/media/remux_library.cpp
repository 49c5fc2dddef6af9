// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/libav_libraries.h"
#include "standalone/media/remux.h"

namespace lookhaven::media {

namespace {

class Library : public RemuxLibrary {
  public:
    void Copy(const std::filesystem::path& recording, int output, const ExportOptions& options) const override {
        Export(recording, output, options);
    }
    bool Join(std::span<const archive::RecordingPart> parts, const JoinOptions& options,
              const ByteSink& sink) const override {
        return media::Join(parts, options, sink);
    }
    std::string SoundOf(const std::filesystem::path& recording) const override { return media::SoundOf(recording); }
};

}  // namespace

}  // namespace lookhaven::media

extern "C" __attribute__((visibility("default"))) const lookhaven::media::RemuxLibrary* LookhavenRemux() {
    static const lookhaven::media::Library library;
    return &library;
}
