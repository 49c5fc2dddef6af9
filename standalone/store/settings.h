// SPDX-License-Identifier: Apache-2.0
//
// Settings by name, and the revision by which others notice a change cheaply.
#pragma once

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "standalone/store/store.h"

namespace lookhaven::store {

// Its value is the digest of a token with which a monitor on another machine may ask for health and metrics.
constexpr const char* kMonitorTokenSetting = "monitor_token";
constexpr std::size_t kMonitorTokenDigits = 48;  // hexadecimal

// Below which folders an account may add mounts, as in PATH: what a stolen account can have written must be bounded.
constexpr const char* kMountFoldersSetting = "mount_folders";
constexpr const char* kMountFolders = "/mnt:/media:/srv";

class Settings {
  public:
    // The store must outlive this object.
    explicit Settings(Store& store) : connection_(store.connection()) {}

    std::optional<std::string> Find(std::string_view key);
    // The setting's number, or fallback where there is none.
    int NumberOr(std::string_view key, int fallback);
    // key: 1 to 64 bytes; value: at most 65,536, without control characters, so in one line. Raises the revision.
    // Throws InvalidRecord.
    void Set(std::string_view key, std::string_view value);

    // The random id of this installation, made by Store::Migrate: what the markers of its mounts name.
    std::string Installation();

    // Grows with every change of what is configured: cameras, mounts, plans, groups, e-maps, servers, settings; not
    // with events, accounts or device states. Reads one row.
    std::int64_t Revision();

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
