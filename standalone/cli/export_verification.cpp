// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/export_verification.h"

#include <array>
#include <map>
#include <memory>
#include <optional>
#include <sstream>
#include <string_view>

#include <archive.h>
#include <archive_entry.h>
#include <unistd.h>

#include "standalone/base/sha256.h"
#include "standalone/base/text.h"
#include "standalone/cli/console.h"
#include "standalone/evidence/manifest.h"
#include "standalone/evidence/signature_library.h"

namespace lookhaven::cli {

namespace {

constexpr std::size_t kBlockBytes = 1 << 16;
constexpr std::size_t kMaxManifestBytes = 64 << 20;
constexpr std::size_t kMaxMembers = 100'000;

struct Member {
    std::string sha256;
    std::string text;  // of the manifest, of its signature and of the key
};

struct FreeArchive {
    void operator()(struct archive* opened) const { archive_read_free(opened); }
};

class Zip {
  public:
    explicit Zip(const std::string& file) : file_(file), archive_(archive_read_new()) {
        archive_read_support_format_zip_seekable(archive_.get());
        archive_read_set_format_option(archive_.get(), "zip", "ignorecrc32", "1");  // the hashes say which file it is
        Require(archive_read_open_filename(archive_.get(), file.c_str(), kBlockBytes));
    }

    std::map<std::string, Member> ReadAll() {
        std::map<std::string, Member> members;
        archive_entry* entry = nullptr;
        for (int result = 0; (result = archive_read_next_header(archive_.get(), &entry)) != ARCHIVE_EOF;) {
            Require(result);
            if (members.size() == kMaxMembers) {
                throw Failure(kDataError, file_, " holds more files than an export does");
            }
            const char* name = archive_entry_pathname_utf8(entry);
            const std::string known = name == nullptr ? "" : name;
            const bool keeps_text = known == evidence::kManifestName || known == evidence::kSignatureName ||
                                    known == evidence::kPublicKeyName;
            if (!members.emplace(known, ReadMember(keeps_text)).second) {
                throw Failure(kDataError, file_, " has two files of one name");
            }
        }
        return members;
    }

  private:
    // Warnings are ignored, such as that the locale cannot represent a name.
    void Require(int result) const {
        if (result < ARCHIVE_WARN) {
            throw Failure(kDataError, file_,
                          " is not an export, or is cut off: ", archive_error_string(archive_.get()));
        }
    }

    Member ReadMember(bool keeps_text) {
        base::Sha256 hash;
        std::array<unsigned char, kBlockBytes> block{};
        Member member;
        while (true) {
            const la_ssize_t got = archive_read_data(archive_.get(), block.data(), block.size());
            Require(got < 0 ? static_cast<int>(got) : ARCHIVE_OK);
            if (got <= 0) {
                break;
            }
            const auto size = static_cast<std::size_t>(got);
            hash.Add(block.data(), size);
            if (keeps_text && member.text.size() + size <= kMaxManifestBytes) {
                member.text.append(reinterpret_cast<const char*>(block.data()), size);
            }
        }
        member.sha256 = hash.Finish();
        return member;
    }

    std::string file_;
    std::unique_ptr<struct archive, FreeArchive> archive_;
};

// A name as the file says it, which may be anything: it can inject no terminal control sequences.
std::string Shown(std::string_view name) {
    std::string shown;
    while (!name.empty()) {
        std::string_view rest = name;
        const std::optional<char32_t> character = base::TakeCharacter(rest);
        const std::string_view bytes = name.substr(0, character ? name.size() - rest.size() : 1);
        const bool is_shown = character && *character >= U' ' && (*character < 0x7F || *character >= 0xA0);
        for (const char byte : bytes) {
            shown +=
                is_shown ? std::string(1, byte) : "\\x" + base::ToHex(std::array{static_cast<unsigned char>(byte)});
        }
        name.remove_prefix(bytes.size());
    }
    return shown;
}

// The hashes by the files' names.
std::map<std::string, std::string> HashesOf(const std::string& file, const std::string& manifest) try {
    Json::Value json;
    std::istringstream(manifest) >> json;
    if (json["format"] != evidence::kManifestFormat) {
        throw Failure(kDataError, file, " has a manifest of another format");
    }
    std::map<std::string, std::string> hashes;
    for (const Json::Value& camera : json["camera"]) {
        for (const Json::Value& each : camera["file"]) {
            hashes.emplace(each["name"].asString(), each["sha256"].asString());
        }
    }
    return hashes;
} catch (const Json::Exception&) {
    throw Failure(kDataError, "the manifest in ", file, " is damaged");
}

using Members = std::map<std::string, Member>;

// Takes signature and key out of the members. An export of an earlier version has neither.
void CheckSignature(Members& members, const std::string& manifest, ExportVerification& verification) {
    const auto signature = members.extract(evidence::kSignatureName);
    const auto key = members.extract(evidence::kPublicKeyName);
    if (signature.empty() && key.empty()) {
        return;
    }
    if (signature.empty() || key.empty()) {
        verification.faults.push_back(
            Concat(signature.empty() ? evidence::kSignatureName : evidence::kPublicKeyName, " is missing"));
        return;
    }
    const evidence::SignatureLibrary& library = evidence::LoadSignatureLibrary();
    if (library.IsSignatureOf(manifest, {signature.mapped().text, key.mapped().text})) {
        verification.fingerprint = library.FingerprintOf(key.mapped().text);
    } else {
        verification.faults.push_back(
            Concat(evidence::kManifestName, ", its signature or its key was changed: they do not belong together"));
    }
}

}  // namespace

ExportVerification VerifyExport(const std::string& file) {
    if (::access(file.c_str(), R_OK) != 0) {
        throw Failure(kNoInput, "there is no file ", file, ", or it cannot be read");
    }
    Members members = Zip(file).ReadAll();
    const auto manifest = members.extract(evidence::kManifestName);
    if (manifest.empty()) {
        throw Failure(kDataError, file, " has no ", evidence::kManifestName, ", so it is not an export");
    }
    ExportVerification verification;
    CheckSignature(members, manifest.mapped().text, verification);
    for (const auto& [name, sha256] : HashesOf(file, manifest.mapped().text)) {
        const auto member = members.extract(name);
        if (member.empty()) {
            verification.faults.push_back(Shown(name) + " is missing");
        } else if (member.mapped().sha256 != sha256) {
            verification.faults.push_back(Shown(name) + " was changed");
        } else {
            ++verification.files;
        }
    }
    for (const auto& [name, member] : members) {
        verification.faults.push_back(Shown(name) + " was added");
    }
    return verification;
}

}  // namespace lookhaven::cli
