// SPDX-License-Identifier: Apache-2.0
#include "standalone/media/libav_libraries.h"

#include <string>
#include <system_error>
#include <thread>

#include <dlfcn.h>

#include "standalone/base/blocked_signals.h"
#include "standalone/media/source.h"

namespace lookhaven::media {

namespace {

template <class Library>
const Library& Load(const char* name, const char* function) {
    // Lazily bound: only a few of the functions of a hundred libraries are ever called.
    void* handle = ::dlopen(name, RTLD_LAZY | RTLD_LOCAL);
    auto* get = handle == nullptr ? nullptr : ::dlsym(handle, function);
    if (get == nullptr) {
        throw SourceError(std::string("cannot load ") + name + ": " + ::dlerror());
    }
    return *reinterpret_cast<const Library* (*)()>(get)();
}

}  // namespace

void BeginLoadingDecoderLibrary() try {
    const base::BlockedSignals blocked;
    std::thread([] {
        try {
            LoadDecoderLibrary();
        } catch (...) {
            // LoadDecoderLibrary reports it.
        }
    }).detach();
} catch (const std::system_error&) {
    // Without a thread it is loaded when needed.
}

const DecoderLibrary& LoadDecoderLibrary() {
    static const auto& library = Load<DecoderLibrary>("liblookhaven-decoder.so", "LookhavenDecoder");
    return library;
}

const RemuxLibrary& LoadRemuxLibrary() {
    static const auto& library = Load<RemuxLibrary>("liblookhaven-remux.so", "LookhavenRemux");
    return library;
}

}  // namespace lookhaven::media
