// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/live_view.h"

#include <dlfcn.h>

#include "standalone/remote/library.h"

namespace lookhaven::remote {

void FetchLiveView(const Host& host, const LiveRequest& request, LiveSink& sink) {
    void* library = ::dlopen("liblookhaven-remote.so", RTLD_NOW | RTLD_LOCAL);
    void* function = library == nullptr ? nullptr : ::dlsym(library, "LookhavenFetchLiveView");
    if (function == nullptr) {
        throw std::runtime_error(std::string("cannot load liblookhaven-remote.so: ") + ::dlerror());
    }
    reinterpret_cast<decltype(&LookhavenFetchLiveView)>(function)(host, request, sink);
}

}  // namespace lookhaven::remote
