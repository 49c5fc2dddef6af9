// SPDX-License-Identifier: Apache-2.0
#include "standalone/evidence/write.h"

#include <algorithm>
#include <stdexcept>
#include <string>
#include <utility>

#include "standalone/base/file.h"
#include "standalone/base/log.h"
#include "standalone/base/sha256.h"
#include "standalone/evidence/manifest.h"
#include "standalone/evidence/zip_writer.h"
#include "standalone/media/source.h"

namespace lookhaven::evidence {

namespace {

constexpr std::int64_t kBlockBytes = 65'536;

// What of the file's recordings was missing for longer than a gap.
class Missing {
  public:
    // may_miss: false: what is missing is an error.
    explicit Missing(bool may_miss) : may_miss_(may_miss) {}

    void Add(const archive::RecordingPart& part, std::int64_t from_wall_ms, const std::string& reason) {
        base::LogWarning("left out of an export: " + reason);
        if (part.LastWallMs() - from_wall_ms <= archive::kMinGapMs) {
            return;
        }
        if (!may_miss_) {
            throw media::SourceError(reason);
        }
        // What touches, or is too much to tell one by one, is one span.
        if (!spans_.empty() &&
            (from_wall_ms - spans_.back().end_ms <= archive::kMinGapMs || std::ssize(spans_) == kMaxMissingSpans)) {
            spans_.back().end_ms = std::max(spans_.back().end_ms, part.LastWallMs());
        } else {
            spans_.push_back({from_wall_ms, part.LastWallMs()});
        }
    }
    std::vector<archive::TimeSpan> Take() { return std::move(spans_); }

  private:
    bool may_miss_;
    std::vector<archive::TimeSpan> spans_;
};

bool JoinFile(const File& file, const media::RemuxLibrary& remux, const media::ByteSink& sink, Missing& missing) {
    media::JoinOptions options{file.container, file.with_sound, file.size_bytes};
    options.on_unreadable = [&missing](const auto& part, std::int64_t from_wall_ms, const std::string& reason) {
        missing.Add(part, from_wall_ms, reason);
    };
    return remux.Join(file.parts, options, sink);
}

WrittenFile AddFile(ZipWriter& zip, const File& file, const media::RemuxLibrary& remux) {
    zip.BeginFile(file.name, file.size_bytes);
    base::Sha256 hash;
    Missing missing(true);
    const auto add = [&](std::span<const std::uint8_t> bytes) {
        hash.Add(bytes.data(), bytes.size());
        return zip.TryWriteData(bytes);
    };
    if (!JoinFile(file, remux, add, missing)) {
        const std::vector<std::uint8_t> zeros(kBlockBytes);
        for (std::int64_t left = file.size_bytes; left > 0; left -= kBlockBytes) {
            if (!add(std::span(zeros).first(static_cast<std::size_t>(std::min(left, kBlockBytes))))) {
                base::ThrowErrno("cannot write an archive");
            }
        }
    }
    zip.EndFile();
    return {hash.Finish(), missing.Take()};
}

void AddText(ZipWriter& zip, const std::string& name, const std::string& text) {
    zip.BeginFile(name, std::ssize(text));
    zip.WriteData({reinterpret_cast<const std::uint8_t*>(text.data()), text.size()});
    zip.EndFile();
}

void AddManifest(ZipWriter& zip, const std::string& manifest, const Signer& sign) {
    const Signature signature = sign(manifest);
    if (signature.bytes.size() != kSignatureBytes || signature.public_key.size() != kPublicKeyBytes) {
        throw std::logic_error("a signature is not as long as it was announced");
    }
    AddText(zip, kManifestName, manifest);
    AddText(zip, kSignatureName, signature.bytes);
    AddText(zip, kPublicKeyName, signature.public_key);
}

void WriteFile(const File& file, const media::RemuxLibrary& remux, const media::ByteSink& sink) {
    Missing missing(false);
    if (!JoinFile(file, remux, sink, missing)) {
        throw media::SourceError("no recording of " + file.name + " can be read any more");
    }
}

}  // namespace

void Write(const Plan& plan, const media::RemuxLibrary& remux, const media::ByteSink& sink, const Signer& sign) {
    ZipWriter zip(sink, plan.request.now_ms + std::int64_t{60'000} * plan.request.utc_offset_min);
    std::vector<WrittenFile> written;
    for (const Camera& camera : plan.cameras) {
        for (const File& file : camera.files) {
            if (!plan.is_archive) {
                WriteFile(file, remux, sink);
                return;
            }
            written.push_back(AddFile(zip, file, remux));
        }
    }
    AddManifest(zip, ManifestOf(plan, written), sign);
    zip.End();
}

}  // namespace lookhaven::evidence
