// SPDX-License-Identifier: Apache-2.0
#include "standalone/camera/resolver_guard.h"

#include <algorithm>

#include <netdb.h>
#include <strings.h>

#include <dlfcn.h>

namespace lookhaven::camera {

namespace {

// Each attempt of HTTPS takes two, and log-in and redirects take attempts.
constexpr int kMaxLookUps = 16;

std::string permitted_host;
std::string refused_host;
int look_ups_left = 0;

std::string_view HostOf(std::string_view url) {
    url.remove_prefix(std::min(url.size(), url.find("://") + 3));
    url = url.substr(0, url.find_first_of("/?#"));
    return url.starts_with('[') ? url.substr(1, url.find(']') - 1) : url.substr(0, url.find(':'));
}

}  // namespace

void PermitHostOf(std::string_view url) {
    permitted_host = HostOf(url);
    look_ups_left = kMaxLookUps;
}

const std::string& RefusedHost() {
    return refused_host;
}

}  // namespace lookhaven::camera

extern "C" __attribute__((visibility("default"))) int getaddrinfo(const char* name, const char* service,
                                                                  const addrinfo* hints, addrinfo** result) {
    using namespace lookhaven::camera;
    static const auto real = reinterpret_cast<decltype(&getaddrinfo)>(::dlsym(RTLD_NEXT, "getaddrinfo"));
    if (name == nullptr || ::strcasecmp(name, permitted_host.c_str()) != 0) {
        // A numeric-only look-up is for the address in a session description, which TCP does not use; it is no
        // redirect.
        const bool only_number = hints != nullptr && (hints->ai_flags & AI_NUMERICHOST) != 0;
        if (name != nullptr && !only_number) {
            refused_host = name;
        }
        return EAI_FAIL;
    }
    if (look_ups_left-- <= 0) {
        return EAI_AGAIN;
    }
    return real(name, service, hints, result);
}
