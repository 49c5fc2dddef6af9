// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/modules.h"

#include <stdexcept>

#include <dlfcn.h>

namespace lookhaven::api {

void Modules::Load(const std::filesystem::path& path) {
    // A name without a slash would be looked for in the system's library folders.
    void* module = ::dlopen(std::filesystem::absolute(path).c_str(), RTLD_NOW | RTLD_LOCAL);
    if (module == nullptr) {
        throw std::runtime_error(std::string("cannot load the module: ") + ::dlerror());
    }
    auto* get_table = reinterpret_cast<const ApiRow* (*)()>(::dlsym(module, "GetAPITable"));
    const ApiRow* row = get_table == nullptr ? nullptr : get_table();
    if (row == nullptr) {
        throw std::runtime_error("the module " + path.string() + " has no table of methods");
    }
    for (; row->api != nullptr; ++row) {
        if (!methods_.emplace(std::tuple(row->api, row->version, row->method), row->entry).second) {
            throw std::runtime_error("two modules serve " + std::string(row->api) + " " + row->method);
        }
    }
}

EntryFunction Modules::Find(const std::string& api, int version, const std::string& method) const {
    const auto found = methods_.find({api, version, method});
    return found == methods_.end() ? nullptr : found->second;
}

}  // namespace lookhaven::api
