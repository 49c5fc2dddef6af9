// SPDX-License-Identifier: Apache-2.0
//
// The web server's certificate and key on disk, replaced as one.
//
// Why so        Two files cannot be renamed in one step, and a certificate with the key of another one keeps the web
//               server from starting. So a whole folder is made next to theirs, and the two are exchanged.
// Invariants    (1) The files of the folder belong together at any moment, also after a crash or a power cut.
//               (2) What else an owner keeps in the folder stays in it.
// One at a time: the constructor throws where somebody else replaces them.
#pragma once

#include <filesystem>
#include <string>

#include "standalone/base/file_descriptor.h"
#include "standalone/base/installation.h"

namespace lookhaven::admin {

class CertificateFolder {
  public:
    // Throws StillNeeded while another process replaces the certificate; std::system_error, as each of these does.
    explicit CertificateFolder(const base::Installation& installation);
    // Removes what was prepared, or what it has replaced.
    ~CertificateFolder();
    CertificateFolder(const CertificateFolder&) = delete;
    CertificateFolder& operator=(const CertificateFolder&) = delete;

    // Those in use; empty where there is none that can be read. Needs no lock.
    static std::string Certificates(const base::Installation& installation);
    // Writes both, readable by the owner alone, to what is not in use. Throws store::InvalidRecord where the folder in
    // use is a link, or has folders or unreadable files in it, which are the owner's to take away. What a process that
    // died has left becomes the folder tls.before.
    void Prepare(const std::string& certificates, const std::string& key);
    // What was prepared is in use, and what was in use is not; the next call undoes that. Where it throws, neither has
    // happened.
    void Exchange() const;

  private:
    std::filesystem::path home_;
    std::filesystem::path used_;
    std::filesystem::path other_;
    base::FileDescriptor lock_;
    bool is_prepared_ = false;
};

}  // namespace lookhaven::admin
