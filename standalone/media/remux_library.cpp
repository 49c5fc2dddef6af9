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
};

}  // namespace

}  // namespace lookhaven::media

extern "C" __attribute__((visibility("default"))) const lookhaven::media::RemuxLibrary* LookhavenRemux() {
    static const lookhaven::media::Library library;
    return &library;
}
