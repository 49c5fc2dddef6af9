// SPDX-License-Identifier: Apache-2.0
//
// Answers a recorder with any bytes in the place of a camera, over RTSP or HTTP: whatever they are, the source must
// end, and deliver only frames that it may.
//
// Why so        There is no network: a connection to anywhere is a local pair of sockets, with the next part of the
//               input and the end of the stream waiting in it. So a redirection leads back to the input too, and no
//               name is looked up.
#include "standalone/media/source.h"

#include <netdb.h>
#include <sys/socket.h>
#include <unistd.h>

#include <dlfcn.h>

#include "test/fuzz/fuzz.h"

using namespace lookhaven;

namespace {

constexpr std::string_view kNextConnection = "\n--next connection--\n";

fuzz::Input answers(nullptr, 0);
std::vector<base::FileDescriptor> cameras;

}  // namespace

// These two stand in for the C library's.
extern "C" __attribute__((visibility("default"))) int connect(int descriptor, const sockaddr*, socklen_t) {
    int pair[2];
    fuzz::Require(::socketpair(AF_UNIX, SOCK_STREAM, 0, pair) == 0);
    const base::FileDescriptor near(pair[0]);
    const std::string_view answer = answers.TakeUntil(kNextConnection);
    ::send(pair[1], answer.data(), answer.size(), MSG_DONTWAIT);
    ::shutdown(pair[1], SHUT_WR);
    cameras.emplace_back(pair[1]);
    return ::dup2(near.Get(), descriptor) < 0 ? -1 : 0;
}

extern "C" __attribute__((visibility("default"))) int getaddrinfo(const char* name, const char* service,
                                                                  const addrinfo* hints, addrinfo** result) {
    static const auto real = reinterpret_cast<decltype(&getaddrinfo)>(::dlsym(RTLD_NEXT, "getaddrinfo"));
    addrinfo numeric = *hints;
    numeric.ai_flags |= AI_NUMERICHOST;
    return real(name, service, &numeric, result);
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const char* const url = input.Take<std::uint8_t>() % 2 == 0 ? "rtsp://127.0.0.1/live" : "http://127.0.0.1/live";
    answers = input;
    cameras.clear();
    const media::SourceOptions options{.credentials = {"owner", "secret"}, .no_data_limit = std::chrono::seconds(2)};
    try {
        const std::unique_ptr<media::Source> source = media::OpenSource(media::CameraKinds(), url, options, {});
        for (;;) {
            const media::Packet packet = source->Next();
            fuzz::Require(!packet.data.empty() && packet.data.size() <= base::kMaxFrameBytes &&
                          packet.format != nullptr);
        }
    } catch (const media::SourceError&) {
    }
    return 0;
}
