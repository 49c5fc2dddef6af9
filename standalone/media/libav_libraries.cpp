// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/libav_libraries.h"

#include <string>

#include <dlfcn.h>

#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

template <class Library>
const Library& Load(const char* name, const char* function) {
    void* handle = ::dlopen(name, RTLD_NOW | RTLD_LOCAL);
    auto* get = handle == nullptr ? nullptr : ::dlsym(handle, function);
    if (get == nullptr) {
        throw SourceError(std::string("cannot load ") + name + ": " + ::dlerror());
    }
    return *reinterpret_cast<const Library* (*)()>(get)();
}

}  // namespace

const DecoderLibrary& LoadDecoderLibrary() {
    static const auto& library = Load<DecoderLibrary>("liblookhaven-decoder.so", "LookhavenDecoder");
    return library;
}

const RemuxLibrary& LoadRemuxLibrary() {
    static const auto& library = Load<RemuxLibrary>("liblookhaven-remux.so", "LookhavenRemux");
    return library;
}

}  // namespace lookhaven::media
