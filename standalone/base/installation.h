// SPDX-License-Identifier: Apache-2.0
//
// The paths of one installation, all of them below its state folder.
//
// Why so        Two installations may run side by side on one machine (tests, a trial beside the real one); they share
//               nothing but the operating system, so names of shared memory derive from the state folder too.
#pragma once

#include <cstdint>
#include <filesystem>
#include <string>

namespace lookhaven::base {

class Installation {
  public:
    // The folder must exist; throws std::system_error otherwise.
    explicit Installation(const std::filesystem::path& home);

    // DefaultHome() of state_folder.h.
    static Installation FromEnvironment();

    // Creates the state folder and its subfolders where they are missing, with access for the caller's user only.
    static void CreateFolders(const std::filesystem::path& home);

    const std::filesystem::path& Home() const { return home_; }
    std::filesystem::path RunFolder() const { return home_ / "run"; }
    // Says where the state folder was when init ran last.
    std::filesystem::path LocationFile() const { return home_ / "location"; }
    std::filesystem::path LogFolder() const { return home_ / "log"; }
    std::filesystem::path TlsFolder() const { return home_ / "tls"; }
    std::filesystem::path SigningKeyFile() const { return home_ / "signing" / "key.pem"; }
    // Held while certificate and key change places, or are copied together.
    std::filesystem::path CertificateLockFile() const { return RunFolder() / "certificate.lock"; }
    std::filesystem::path ProgressFolder() const { return RunFolder() / "progress"; }
    std::filesystem::path WebApiSocket() const { return RunFolder() / "webapi.sock"; }

    // "sqlite:<path>" or "postgresql://…": the file "store" in the state folder, else SQLite inside the folder.
    std::string StoreUrl() const;
    // From the next call of StoreUrl on; running programs keep the one they have. Throws std::system_error.
    void SetStoreUrl(const std::string& url) const;

    // The id of this machine among the hosts that share its store (store/hosts.h), in the file "host" of the state
    // folder; 0 where it was never added as one. Both throw std::system_error, HostId also where the file holds none.
    int HostId() const;
    void SetHostId(int id) const;  // 0: it is none any more

    // Tells installations of this machine apart; stable while the folder stays where it is.
    std::uint64_t Id() const { return id_; }

  private:
    std::string DefaultStoreUrl() const;

    std::filesystem::path home_;
    std::uint64_t id_;
};

}  // namespace lookhaven::base
