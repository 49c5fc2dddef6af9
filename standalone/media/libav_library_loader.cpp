// SPDX-License-Identifier: Apache-2.0
#include <string>

#include <dlfcn.h>

#include "standalone/media/libav_library.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

const LibavLibrary& LoadLibavLibrary() {
    static const LibavLibrary* library = [] {
        void* handle = ::dlopen(kLibavLibrary, RTLD_NOW | RTLD_LOCAL);
        auto* get = handle == nullptr ? nullptr : ::dlsym(handle, kLibavFunction);
        if (get == nullptr) {
            throw SourceError(std::string("cannot load the decoder: ") + ::dlerror());
        }
        return reinterpret_cast<const LibavLibrary* (*)()>(get)();
    }();
    return *library;
}

}  // namespace lookhaven::media
