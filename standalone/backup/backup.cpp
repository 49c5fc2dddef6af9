// SPDX-License-Identifier: Apache-2.0
#include "standalone/backup/backup.h"

#include <algorithm>
#include <array>
#include <filesystem>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <stdexcept>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

#include <fcntl.h>
#include <json/json.h>
#include <sys/file.h>

#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/emap/pictures.h"
#include "standalone/store/copy.h"
#include "standalone/store/emap_pictures.h"

namespace lookhaven::backup {

namespace {

namespace fs = std::filesystem;

constexpr int kFormat = 1;
constexpr const char* kManifest = "manifest.json";
constexpr const char* kRecords = "records.db";
constexpr const char* kPictures = "emaps";
constexpr const char* kCertificate = "tls";
constexpr const char* kSigning = "signing";
constexpr std::string_view kSigningKey = "key.pem";
// The last one says which of them Lookhaven made itself.
constexpr std::array<std::string_view, 3> kCertificateFiles = {"certificate.pem", "key.pem", "made-here"};

// A folder of its own in the run folder; what an interrupted one left goes first.
class WorkFolder {
  public:
    explicit WorkFolder(const base::Installation& installation)
        : path_(installation.RunFolder() / "backup"),
          lock_(base::OpenFile(installation.RunFolder() / "backup.lock", O_RDWR | O_CREAT)) {
        if (::flock(lock_.Get(), LOCK_EX | LOCK_NB) != 0) {
            throw std::runtime_error("another backup of " + installation.Home().string() + " is made or restored");
        }
        fs::remove_all(path_);
        fs::create_directory(path_);
        fs::permissions(path_, fs::perms::owner_all);
    }
    WorkFolder(const WorkFolder&) = delete;
    WorkFolder& operator=(const WorkFolder&) = delete;
    ~WorkFolder() {
        std::error_code ignored;
        fs::remove_all(path_, ignored);
    }

    fs::path operator/(const std::string& name) const { return path_ / name; }

  private:
    fs::path path_;
    base::FileDescriptor lock_;
};

std::string SqliteUrl(const fs::path& path) {
    return "sqlite:" + path.string();
}

// Limits: the size of the manifest, of each certificate file and of the signing key; and the number of files.
constexpr std::uintmax_t kMaxTextBytes = std::uintmax_t{1} << 20U;
constexpr std::size_t kMaxFiles = 10'000;

// How large a file of that name may be, which is written where the name says; nothing for one that belongs to no
// backup. Of a disk that has just room for the records, half stays free for their copy.
std::optional<std::uintmax_t> MaxBytesOf(std::string_view name, const fs::path& folder) {
    if (name == kRecords) {
        return fs::space(folder).available / 2;
    }
    if (name == kManifest) {
        return kMaxTextBytes;
    }
    const std::size_t slash = std::min(name.find('/'), name.size());
    const std::string_view file = name.substr(std::min(slash + 1, name.size()));
    if (name.substr(0, slash) == kPictures && emap::IsPictureName(file)) {
        return emap::kMaxPictureBytes;
    }
    if (name.substr(0, slash) == kCertificate &&
        std::ranges::find(kCertificateFiles, file) != kCertificateFiles.end()) {
        return kMaxTextBytes;
    }
    if (name.substr(0, slash) == kSigning && file == kSigningKey) {
        return kMaxTextBytes;
    }
    return std::nullopt;
}

// The folder's files that belong to a backup, if there is a folder.
std::vector<fs::path> FilesOf(const std::string& folder, const fs::path& path) {
    std::error_code error;
    std::vector<fs::path> files;
    for (const fs::directory_entry& file : fs::directory_iterator(path, error)) {
        const std::string name = folder + "/" + file.path().filename().string();
        if (fs::is_regular_file(file.symlink_status()) && MaxBytesOf(name, path)) {
            files.push_back(file.path());
        }
    }
    if (error && error != std::errc::no_such_file_or_directory) {
        throw std::system_error(error, "cannot read " + path.string());
    }
    return files;
}

// Copies certificate and key under the lock, so that they match. Copied first, so that replacing them need not wait
// for the backup's destination.
void CopyKeys(const base::Installation& installation, const WorkFolder& folder) {
    const base::FileDescriptor lock = base::LockFile(installation.CertificateLockFile());
    for (const auto& [name, path] : {std::pair{kCertificate, installation.TlsFolder()},
                                     std::pair{kSigning, installation.SigningKeyFile().parent_path()}}) {
        fs::create_directory(folder / name);
        for (const fs::path& file : FilesOf(name, path)) {
            fs::copy_file(file, folder / name / file.filename());
        }
    }
}

// Those that maps of the records have and this host has not as files, which another host of the store has written.
void FetchPictures(store::Store& store, store::Store& records, const fs::path& own, const fs::path& folder) {
    fs::create_directory(folder);
    for (const store::Emap& emap : store::Emaps(records).List()) {
        if (emap::IsPictureName(emap.image) && !fs::exists(own / emap.image)) {
            if (const auto bytes = store::EmapPictures(store).Find(emap.image)) {
                base::WriteFileAtomically(folder / emap.image, *bytes);
            }
        }
    }
}

class BackupWriter {
  public:
    explicit BackupWriter(int descriptor) : tar_(descriptor) {}

    void Add(const std::string& name, const fs::path& path) {
        const FileDigest digest = tar_.AddFile(name, path);
        Json::Value& file = files_.append(Json::objectValue);
        file["name"] = name;
        file["size"] = Json::Int64{digest.size_bytes};
        file["sha256"] = digest.sha256;
    }

    // Returns how many files were added: those whose name another one has had are left out.
    int AddFolder(const std::string& folder, const fs::path& path) {
        int added = 0;
        for (const fs::path& file : FilesOf(folder, path)) {
            const std::string name = folder + "/" + file.filename().string();
            if (names_.insert(name).second) {
                Add(name, file);
                ++added;
            }
        }
        return added;
    }

    void Finish(const Summary& summary) {
        Json::Value manifest;
        manifest["lookhaven_backup"] = kFormat;
        manifest["version"] = summary.version;
        manifest["made"] = Json::Int64{summary.made_s};
        manifest["file"] = files_;
        tar_.AddText(kManifest, manifest.toStyledString());
        tar_.Finish();
    }

  private:
    TarWriter tar_;
    Json::Value files_ = Json::arrayValue;
    std::set<std::string> names_;
};

// Throws Malformed unless the manifest names those files with those contents, and no others.
Summary CheckManifest(const fs::path& path, const std::map<std::string, FileDigest>& files) try {
    Json::Value manifest;
    const std::string text = base::ReadFile(path);
    std::string errors;
    const std::unique_ptr<Json::CharReader> reader(Json::CharReaderBuilder().newCharReader());
    if (!reader->parse(text.data(), text.data() + text.size(), &manifest, &errors)) {
        throw Malformed("the backup's manifest is damaged");
    }
    if (manifest["lookhaven_backup"].asInt() != kFormat) {
        throw Malformed("the backup was made by a newer program: update Lookhaven on this host");
    }
    std::map<std::string, FileDigest> named;
    for (const Json::Value& file : manifest["file"]) {
        named[file["name"].asString()] = {file["size"].asInt64(), file["sha256"].asString()};
    }
    if (named != files || !files.contains(kRecords)) {
        throw Malformed("the backup is damaged: its files are not those that its manifest names");
    }
    return {.version = manifest["version"].asString(), .made_s = manifest["made"].asInt64()};
} catch (const Json::Exception&) {
    throw Malformed("the backup's manifest is damaged");
}

// Unpacks everything below the folder, and throws Malformed for what is not whole.
Summary Unpack(int descriptor, const WorkFolder& folder) {
    for (const char* name : {kPictures, kCertificate, kSigning}) {
        fs::create_directory(folder / name);
    }
    TarReader tar(descriptor);
    std::map<std::string, FileDigest> files;
    bool is_whole = false;
    while (const std::optional<std::string> name = tar.Next()) {
        const std::optional<std::uintmax_t> max_bytes = MaxBytesOf(*name, folder / "");
        if (!max_bytes || files.contains(*name) || files.size() == kMaxFiles || is_whole) {
            throw Malformed("this is not a backup, or a damaged one: it holds a file that belongs to none");
        }
        const FileDigest digest = tar.CopyTo(folder / *name, *max_bytes);
        is_whole = *name == kManifest;
        if (!is_whole) {
            files[*name] = digest;
        }
    }
    if (!is_whole) {
        throw Malformed("the backup is incomplete: its end is missing");
    }
    return CheckManifest(folder / kManifest, files);
}

// Each file becomes visible in one step. Returns how many there are.
int MoveFiles(const fs::path& from, const fs::path& to) {
    int count = 0;
    for (const fs::directory_entry& file : fs::directory_iterator(from)) {
        if (fs::create_directories(to)) {
            fs::permissions(to, fs::perms::owner_all);
        }
        fs::rename(file.path(), to / file.path().filename());
        ++count;
    }
    return count;
}

}  // namespace

Summary Write(const base::Installation& installation, store::Store& store, int descriptor, Certificate certificate,
              const std::string& version) {
    const WorkFolder folder(installation);
    const fs::path records = folder / kRecords;
    Summary summary{.version = version, .made_s = base::WallSeconds()};
    // First the records: a picture is there before the first map names it, and for a minute after the last.
    store::Store::Migrate(SqliteUrl(records));
    {
        store::Store copy = store::Store::Open(SqliteUrl(records));
        summary.records = CopyRecords(store, copy, store::CopySessions::kNo, store::CopyPictures::kNo);
        FetchPictures(store, copy, installation.Home() / kPictures, folder / kPictures);
        store::CheckpointWal(copy);
    }
    BackupWriter writer(descriptor);
    writer.Add(kRecords, records);
    summary.pictures = writer.AddFolder(kPictures, folder / kPictures);
    summary.pictures += writer.AddFolder(kPictures, installation.Home() / kPictures);
    if (certificate == Certificate::kIncluded) {
        CopyKeys(installation, folder);
        summary.has_certificate = writer.AddFolder(kCertificate, folder / kCertificate) > 0;
        writer.AddFolder(kSigning, folder / kSigning);
    }
    writer.Finish(summary);
    return summary;
}

Summary Restore(const base::Installation& installation, int descriptor) {
    const WorkFolder folder(installation);
    Summary summary = Unpack(descriptor, folder);
    const std::string records = SqliteUrl(folder / kRecords);
    store::RequireTablesOnly(records);
    store::Store::Migrate(records);
    store::Store source = store::Store::Open(records);
    store::Store::Migrate(installation.StoreUrl());
    store::Store target = store::Store::Open(installation.StoreUrl());
    store::RequireUnused(target);
    // First the pictures, which no map names yet: a map never lacks its picture.
    summary.pictures = MoveFiles(folder / kPictures, installation.Home() / kPictures);
    summary.records = CopyRecords(source, target, store::CopySessions::kNo);
    emap::Pictures(target, installation.Home()).Share();
    const base::FileDescriptor lock = base::LockFile(installation.CertificateLockFile());
    summary.has_certificate = MoveFiles(folder / kCertificate, installation.TlsFolder()) > 0;
    MoveFiles(folder / kSigning, installation.SigningKeyFile().parent_path());
    return summary;
}

}  // namespace lookhaven::backup
