// SPDX-License-Identifier: Apache-2.0
//
// The loaded web API modules, and which of their functions serves a method.
#pragma once

#include <filesystem>
#include <map>
#include <string>
#include <tuple>

#include "platform/webapi/apirequest.h"
#include "platform/webapi/apiresponse.h"

namespace lookhaven::api {

using EntryFunction = void (*)(VEXO::APIRequest*, VEXO::APIResponse*);

// A row of the table that a module's GetAPITable returns; the table ends with a row of zeros.
struct ApiRow {
    const char* api;
    int version;
    const char* method;
    EntryFunction entry;
};

class Modules {
  public:
    // Loads the shared object for the rest of the process's life and reads its table. Throws std::runtime_error when
    // it cannot be loaded, exports no table, or names a method that another module has.
    void Load(const std::filesystem::path& path);

    // Null when no module has that method.
    EntryFunction Find(const std::string& api, int version, const std::string& method) const;

  private:
    std::map<std::tuple<std::string, int, std::string>, EntryFunction> methods_;
};

}  // namespace lookhaven::api
