// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/certificate_folder.h"

#include <cstdio>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include "standalone/admin/change.h"
#include "standalone/base/file.h"
#include "standalone/base/log.h"
#include "standalone/store/store.h"

namespace lookhaven::admin {

namespace {

constexpr const char* kCertificate = "certificate.pem";
constexpr const char* kKey = "key.pem";
constexpr const char* kUnfinished = "new";  // of packaging/prepare-web

void Sync(const std::filesystem::path& folder) {
    const base::FileDescriptor opened = base::OpenFile(folder, O_RDONLY | O_DIRECTORY);
    if (::fsync(opened.Get()) != 0) {
        base::ThrowErrno("cannot write " + folder.string());
    }
}

// Where the kernel lets only its owner link a file (fs.protected_hardlinks), it is copied.
void LinkOrCopy(const std::filesystem::path& file, const std::filesystem::path& folder) try {
    namespace fs = std::filesystem;
    const fs::path target = folder / file.filename();
    std::error_code refused;
    fs::create_hard_link(file, target, refused);
    if (refused) {
        const fs::perms permissions = fs::status(file).permissions() & static_cast<fs::perms>(0644);
        base::WriteFileAtomically(target, base::ReadFile(file), static_cast<unsigned int>(permissions));
    }
} catch (const std::system_error& error) {
    if (error.code() != std::errc::permission_denied) {
        throw;
    }
    throw store::InvalidRecord(file.string() + " cannot be read: move it elsewhere first");
}

}  // namespace

CertificateFolder::CertificateFolder(const base::Installation& installation)
    : home_(installation.Home()),
      used_(installation.TlsFolder()),
      other_(home_ / "tls.new"),
      lock_(base::TryLockFile(installation.CertificateLockFile())) {
    if (!lock_) {
        throw StillNeeded("the certificate is being replaced or backed up at this moment");
    }
}

CertificateFolder::~CertificateFolder() {
    if (is_prepared_) {
        std::error_code ignored;
        std::filesystem::remove_all(other_, ignored);
    }
}

std::string CertificateFolder::Certificates(const base::Installation& installation) {
    try {
        return base::ReadFile(installation.TlsFolder() / kCertificate);
    } catch (const std::system_error&) {
        return "";
    }
}

void CertificateFolder::Prepare(const std::string& certificates, const std::string& key) {
    namespace fs = std::filesystem;
    if (fs::is_symlink(used_)) {
        throw store::InvalidRecord("the folder " + used_.string() + " is a link: replace the files where it leads");
    }
    fs::create_directory(used_);
    if (fs::exists(other_)) {
        // Left by a process that died: it may be the last pair that the web server accepted.
        fs::remove_all(home_ / "tls.before");
        fs::rename(other_, home_ / "tls.before");
    }
    is_prepared_ = true;
    if (::mkdir(other_.c_str(), 0700) != 0) {
        base::ThrowErrno("cannot make " + other_.string());
    }
    for (const fs::directory_entry& entry : fs::directory_iterator(used_)) {
        const fs::path name = entry.path().filename();
        if (name == kCertificate || name == kKey || name == kUnfinished) {
            continue;
        }
        if (entry.is_symlink()) {
            fs::copy_symlink(entry.path(), other_ / name);
        } else if (entry.is_directory()) {
            throw store::InvalidRecord("the folder " + used_.string() + " holds another folder, " + name.string() +
                                       ": move that elsewhere first");
        } else {
            LinkOrCopy(entry.path(), other_);
        }
    }
    base::WriteFileAtomically(other_ / kKey, key);
    base::WriteFileAtomically(other_ / kCertificate, certificates);
    Sync(other_);
}

void CertificateFolder::Exchange() const {
    const base::FileDescriptor home = base::OpenFile(home_, O_RDONLY | O_DIRECTORY);
    if (::renameat2(AT_FDCWD, other_.c_str(), AT_FDCWD, used_.c_str(), RENAME_EXCHANGE) != 0) {
        base::ThrowErrno("cannot replace " + used_.string());
    }
    if (::fsync(home.Get()) != 0) {
        // The folders are exchanged all the same, so this must not look like a failure.
        base::LogError("cannot sync " + home_.string() + " after the certificate was replaced");
    }
}

}  // namespace lookhaven::admin
