// SPDX-License-Identifier: Apache-2.0
//
// Simulates any number of cameras: H.264 with AAC by RTSP, and Motion JPEG by HTTP, 25 frames a second from memory.
//
// Arguments: an Annex B file with access unit delimiters, an ADTS file of 48 kHz, a JPEG file. Prints both ports,
// RTSP's first. Each connection is a camera of its own, whatever path it asks for; their frames are spread over the
// frame's time.
#include <algorithm>
#include <array>
#include <cerrno>
#include <csignal>
#include <cstdint>
#include <iostream>
#include <list>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/prctl.h>
#include <sys/socket.h>

#include "bench/footage.h"
#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/file_descriptor.h"

namespace {

using bench::Footage;
using lookhaven::base::FileDescriptor;
using lookhaven::base::MonotonicMicros;

constexpr std::int64_t kFrameMicros = 40'000;
constexpr std::uint32_t kVideoTicks = 3600;  // of 90 kHz a frame
constexpr std::uint32_t kAudioTicks = 1024;  // of 48 kHz an AAC frame
constexpr std::size_t kPayloadBytes = 1400;
constexpr std::int64_t kSpreadMicros = 7'300;  // shares no factor with a frame's time
constexpr std::size_t kMaxUnsentBytes = 4 << 20;

void AppendBig(std::string& to, std::uint32_t value, int bytes) {
    while (bytes-- > 0) {
        to.push_back(static_cast<char>(value >> (8 * bytes)));
    }
}

// One RTP stream of a connection, its packets interleaved into it.
struct RtpStream {
    unsigned channel;
    unsigned payload_type;
    std::uint16_t sequence = 0;

    void Append(std::string& out, bool last, std::uint32_t ticks, std::string_view head, std::string_view payload) {
        out.push_back('$');
        AppendBig(out, channel, 1);
        AppendBig(out, static_cast<std::uint32_t>(12 + head.size() + payload.size()), 2);
        AppendBig(out, 0x80, 1);
        AppendBig(out, (last ? 0x80U : 0U) | payload_type, 1);
        AppendBig(out, sequence++, 2);
        AppendBig(out, ticks, 4);
        AppendBig(out, 0x4c480000U + channel, 4);
        out.append(head).append(payload);
    }

    void AppendNal(std::string& out, bool last, std::uint32_t ticks, std::string_view nal) {
        if (nal.size() <= kPayloadBytes) {
            return Append(out, last, ticks, "", nal);
        }
        const char kind = nal[0];
        for (std::size_t at = 1; at < nal.size(); at += kPayloadBytes) {
            const std::string_view piece = nal.substr(at, kPayloadBytes);
            const bool ends = at + piece.size() == nal.size();
            const std::array<char, 2> head{static_cast<char>((kind & 0x60) | 28),
                                           static_cast<char>((kind & 0x1f) | (at == 1 ? 0x80 : 0) | (ends ? 0x40 : 0))};
            Append(out, last && ends, ticks, {head.data(), head.size()}, piece);
        }
    }

    void AppendAac(std::string& out, std::uint32_t ticks, std::string_view frame) {
        std::string head;
        AppendBig(head, 16, 2);
        AppendBig(head, static_cast<std::uint32_t>(frame.size()) << 3, 2);
        Append(out, true, ticks, head, frame);
    }
};

struct Client {
    FileDescriptor socket;
    bool is_rtsp = false;
    bool plays = false;
    std::string request;
    std::string unsent;
    std::int64_t begin_micros = 0;
    std::uint32_t video_frames = 0;
    std::uint32_t audio_frames = 0;
    RtpStream video{0, 96};
    RtpStream audio{2, 97};

    std::int64_t DueMicros() const { return begin_micros + video_frames * kFrameMicros; }
};

std::string ValueOf(const std::string& request, std::string_view field) {
    const std::size_t at = request.find(field);
    return at == request.npos ? "" : request.substr(at + field.size(), request.find("\r\n", at) - at - field.size());
}

std::string Describe(const Footage& footage) {
    return "v=0\r\no=- 0 0 IN IP4 127.0.0.1\r\ns=camera\r\nt=0 0\r\n"
           "m=video 0 RTP/AVP 96\r\na=rtpmap:96 H264/90000\r\na=fmtp:96 packetization-mode=1\r\na=control:video\r\n"
           "m=audio 0 RTP/AVP 97\r\na=rtpmap:97 MPEG4-GENERIC/48000/2\r\na=fmtp:97 streamtype=5;profile-level-id=1;"
           "mode=AAC-hbr;sizelength=13;indexlength=3;indexdeltalength=3;config=" +
           footage.audio_config + "\r\na=control:audio\r\n";
}

class Cameras {
  public:
    explicit Cameras(Footage footage) : footage_(std::move(footage)) {
        for (FileDescriptor& listener : listeners_) {
            listener.Reset(::socket(AF_INET, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
            sockaddr_in address{};
            address.sin_family = AF_INET;
            address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
            socklen_t size = sizeof address;
            auto* generic = reinterpret_cast<sockaddr*>(&address);
            if (::bind(listener.Get(), generic, size) != 0 || ::listen(listener.Get(), 128) != 0 ||
                ::getsockname(listener.Get(), generic, &size) != 0) {
                lookhaven::base::ThrowErrno("the cameras cannot listen");
            }
            std::cout << ntohs(address.sin_port) << (&listener == listeners_.data() ? ' ' : '\n') << std::flush;
        }
    }

    void Step() {
        std::vector<pollfd> waiting;
        std::int64_t due = MonotonicMicros() + 1'000'000;
        for (const FileDescriptor& listener : listeners_) {
            waiting.push_back({listener.Get(), POLLIN, 0});
        }
        for (const Client& client : clients_) {
            const int events = client.unsent.empty() ? POLLIN : POLLIN | POLLOUT;
            waiting.push_back({client.socket.Get(), static_cast<short>(events), 0});
            due = client.plays ? std::min(due, client.DueMicros()) : due;
        }
        const std::int64_t left = std::max<std::int64_t>(due - MonotonicMicros(), 0);
        const timespec limit{left / 1'000'000, static_cast<long>(left % 1'000'000 * 1000)};
        ::ppoll(waiting.data(), waiting.size(), &limit, nullptr);
        std::size_t place = listeners_.size();
        clients_.remove_if([&](Client& client) { return !Serve(client, waiting[place++].revents); });
        Accept();
    }

  private:
    void Accept() {
        for (const FileDescriptor& listener : listeners_) {
            FileDescriptor socket(::accept4(listener.Get(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK));
            if (socket) {
                clients_.emplace_back().socket = std::move(socket);
                clients_.back().is_rtsp = &listener == listeners_.data();
            }
        }
    }

    // False when the client has gone.
    bool Serve(Client& client, int events) {
        if ((events & (POLLIN | POLLHUP | POLLERR)) != 0) {
            std::array<char, 4096> block{};
            const ssize_t got = ::recv(client.socket.Get(), block.data(), block.size(), 0);
            if (got <= 0 && errno != EAGAIN) {
                return false;
            }
            client.request.append(block.data(), static_cast<std::size_t>(std::max<ssize_t>(got, 0)));
            AnswerAll(client);
        }
        while (client.plays && client.DueMicros() <= MonotonicMicros() && client.unsent.size() < kMaxUnsentBytes) {
            AppendFrame(client);
        }
        if (!client.unsent.empty()) {
            const ssize_t sent = ::send(client.socket.Get(), client.unsent.data(), client.unsent.size(), MSG_NOSIGNAL);
            if (sent < 0 && errno != EAGAIN) {
                return false;
            }
            client.unsent.erase(0, static_cast<std::size_t>(std::max<ssize_t>(sent, 0)));
        }
        return true;
    }

    void AnswerAll(Client& client) {
        while (client.request.starts_with('$') && client.request.size() >= 4) {  // the client's receiver report
            const auto* size = reinterpret_cast<const unsigned char*>(client.request.data()) + 2;
            const std::size_t whole = 4U + (static_cast<std::size_t>(size[0]) << 8 | size[1]);
            if (client.request.size() < whole) {
                return;
            }
            client.request.erase(0, whole);
        }
        const std::size_t end = client.request.find("\r\n\r\n");
        if (end == client.request.npos) {
            return;
        }
        const std::string request = client.request.substr(0, end + 2);
        client.request.erase(0, end + 4);
        client.is_rtsp ? AnswerRtsp(client, request) : AnswerHttp(client);
        AnswerAll(client);
    }

    void Play(Client& client) {
        client.plays = true;
        client.begin_micros = MonotonicMicros() + players_++ * kSpreadMicros % kFrameMicros;
    }

    void AnswerHttp(Client& client) {
        client.unsent += "HTTP/1.1 200 OK\r\nConnection: close\r\n"
                         "Content-Type: multipart/x-mixed-replace; boundary=edge\r\n\r\n";
        Play(client);
    }

    void AnswerRtsp(Client& client, const std::string& request) {
        std::string fields = "Session: 1\r\n";
        std::string body;
        if (request.starts_with("DESCRIBE")) {
            body = Describe(footage_);
            const std::string url = request.substr(9, request.find(' ', 9) - 9);
            fields = "Content-Type: application/sdp\r\nContent-Base: " + url + "/\r\n";
        } else if (request.starts_with("SETUP")) {
            const bool is_audio = request.substr(0, request.find("\r\n")).find("/audio") != request.npos;
            fields += std::string("Transport: RTP/AVP/TCP;unicast;interleaved=") + (is_audio ? "2-3" : "0-1") + "\r\n";
        } else if (request.starts_with("PLAY")) {
            Play(client);
        } else if (request.starts_with("OPTIONS")) {
            fields = "Public: OPTIONS, DESCRIBE, SETUP, PLAY, GET_PARAMETER, TEARDOWN\r\n";
        }
        client.unsent += "RTSP/1.0 200 OK\r\nCSeq: " + ValueOf(request, "CSeq: ") + "\r\n" + fields +
                         "Content-Length: " + std::to_string(body.size()) + "\r\n\r\n" + body;
    }

    void AppendFrame(Client& client) {
        const std::uint32_t number = client.video_frames++;
        if (!client.is_rtsp) {
            client.unsent +=
                "--edge\r\nContent-Type: image/jpeg\r\nContent-Length: " + std::to_string(footage_.jpeg.size()) +
                "\r\n\r\n" + footage_.jpeg + "\r\n";
            return;
        }
        const auto& nals = footage_.video[number % footage_.video.size()];
        for (const std::string& nal : nals) {
            client.video.AppendNal(client.unsent, &nal == &nals.back(), number * kVideoTicks, nal);
        }
        const std::int64_t played = (number + 1) * kFrameMicros;
        while (client.audio_frames * std::int64_t{kAudioTicks} * 1000 / 48 < played) {
            const std::uint32_t ticks = client.audio_frames * kAudioTicks;
            client.audio.AppendAac(client.unsent, ticks, footage_.audio[client.audio_frames++ % footage_.audio.size()]);
        }
    }

    const Footage footage_;
    std::array<FileDescriptor, 2> listeners_;  // RTSP, HTTP
    std::list<Client> clients_;
    std::int64_t players_ = 0;
};

}  // namespace

int main(int count, char** arguments) try {
    if (count != 4) {
        std::cerr << "usage: bench_cameras VIDEO.h264 AUDIO.aac PICTURE.jpg\n";
        return 64;
    }
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    Cameras cameras(bench::ReadFootage(arguments[1], arguments[2], arguments[3]));
    for (;;) {
        cameras.Step();
    }
} catch (const std::exception& error) {
    std::cerr << "bench_cameras: " << error.what() << '\n';
    return 1;
}
