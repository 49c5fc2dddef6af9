// SPDX-License-Identifier: Apache-2.0
//
// Settings by name, and the revision by which others notice a change cheaply.
#pragma once

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

#include "standalone/store/store.h"

namespace lookhaven::store {

class Settings {
  public:
    // The store must outlive this object.
    explicit Settings(Store& store) : connection_(store.connection()) {}

    std::optional<std::string> Find(std::string_view key);
    // key: 1 to 64 bytes. Raises the revision.
    void Set(std::string_view key, std::string_view value);

    // Grows with every change of cameras and settings; reads one row.
    std::int64_t Revision();

  private:
    Connection& connection_;
};

}  // namespace lookhaven::store
