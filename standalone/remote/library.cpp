// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/library.h"

#include <stdexcept>
#include <string>

#include <dlfcn.h>

namespace lookhaven::remote {

void* FindInLibrary(const char* name) {
    void* library = ::dlopen("liblookhaven-remote.so", RTLD_NOW | RTLD_LOCAL);
    void* function = library == nullptr ? nullptr : ::dlsym(library, name);
    if (function == nullptr) {
        throw std::runtime_error(std::string("cannot load liblookhaven-remote.so: ") + ::dlerror());
    }
    return function;
}

}  // namespace lookhaven::remote
