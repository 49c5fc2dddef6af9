// SPDX-License-Identifier: Apache-2.0
#include "standalone/evidence/write.h"

#include <array>
#include <string>

#include <sodium.h>

#include "standalone/evidence/manifest.h"
#include "standalone/evidence/zip_writer.h"

namespace lookhaven::evidence {

namespace {

class Sha256 {
  public:
    Sha256() { crypto_hash_sha256_init(&state_); }

    void Add(std::span<const std::uint8_t> bytes) { crypto_hash_sha256_update(&state_, bytes.data(), bytes.size()); }

    std::string Text() {
        std::array<unsigned char, crypto_hash_sha256_BYTES> hash{};
        crypto_hash_sha256_final(&state_, hash.data());
        std::array<char, kHashCharacters + 1> text{};
        sodium_bin2hex(text.data(), text.size(), hash.data(), hash.size());
        return text.data();
    }

  private:
    crypto_hash_sha256_state state_{};
};

void JoinFile(const File& file, const media::RemuxLibrary& remux, const media::ByteSink& sink) {
    remux.Join(file.parts, {file.container, file.with_sound, file.size_bytes}, sink);
}

// Returns the file's hash.
std::string AddFile(ZipWriter& zip, const File& file, const media::RemuxLibrary& remux) {
    zip.BeginFile(file.name, file.size_bytes);
    Sha256 hash;
    JoinFile(file, remux, [&](std::span<const std::uint8_t> bytes) {
        hash.Add(bytes);
        return zip.TryWriteData(bytes);
    });
    zip.EndFile();
    return hash.Text();
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
