// SPDX-License-Identifier: Apache-2.0
#include "standalone/evidence/write.h"

#include <string>

#include "standalone/base/sha256.h"
#include "standalone/evidence/manifest.h"
#include "standalone/evidence/zip_writer.h"

namespace lookhaven::evidence {

namespace {

void JoinFile(const File& file, const media::RemuxLibrary& remux, const media::ByteSink& sink) {
    remux.Join(file.parts, {file.container, file.with_sound, file.size_bytes}, sink);
}

// Returns the file's hash.
std::string AddFile(ZipWriter& zip, const File& file, const media::RemuxLibrary& remux) {
    zip.BeginFile(file.name, file.size_bytes);
    base::Sha256 hash;
    JoinFile(file, remux, [&](std::span<const std::uint8_t> bytes) {
        hash.Add(bytes.data(), bytes.size());
        return zip.TryWriteData(bytes);
    });
    zip.EndFile();
    return hash.Finish();
}

}  // namespace

void Write(const Plan& plan, const media::RemuxLibrary& remux, const media::ByteSink& sink) {
    ZipWriter zip(sink, plan.request.now_ms + std::int64_t{60'000} * plan.request.utc_offset_min);
    std::vector<std::string> hashes;
    for (const Camera& camera : plan.cameras) {
        for (const File& file : camera.files) {
            if (!plan.is_archive) {
                JoinFile(file, remux, sink);
                return;
            }
            hashes.push_back(AddFile(zip, file, remux));
        }
    }
    const std::string manifest = ManifestOf(plan, hashes);
    zip.BeginFile(kManifestName, std::ssize(manifest));
    zip.WriteData({reinterpret_cast<const std::uint8_t*>(manifest.data()), manifest.size()});
    zip.EndFile();
    zip.End();
}

}  // namespace lookhaven::evidence
