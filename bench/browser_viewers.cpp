// SPDX-License-Identifier: Apache-2.0
//
// Plays many viewers of one live stream as browsers do, over TLS and HTTP/2 with several streams on a connection, and
// prints, as one JSON object, how late the pictures arrived.
//
// Windows and ciphers are Chromium's. Times count as in viewers.cpp. With --throttle the first stream reads only that
// many bytes a second, as a page does whose decoder is too slow; its pictures are not counted.
#include <algorithm>
#include <array>
#include <cstdint>
#include <iostream>
#include <memory>
#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <fcntl.h>
#include <nghttp2/nghttp2.h>
#include <openssl/err.h>
#include <openssl/ssl.h>
#include <sys/epoll.h>

#include "bench/connection.h"
#include "bench/part_reader.h"
#include "bench/percentile.h"
#include "standalone/base/clock.h"

namespace {

using lookhaven::base::FileDescriptor;
using lookhaven::base::MonotonicMicros;

constexpr std::int32_t kStreamWindowBytes = 6 << 20;
constexpr std::int32_t kConnectionWindowBytes = 15 << 20;
constexpr int kRecordsInTurn = 64;  // then other connections

struct Options {
    bench::Target target;
    int viewers = 1;
    int streams = 32;  // on a connection at most
    double seconds = 10;
    double settle_seconds = 2;
    double throttle = 0;  // bytes a second
};

struct Tally {
    std::vector<std::int64_t> latencies;
    std::int64_t bytes = 0;
    int ended = 0;
};

struct Stream {
    bench::PartReader parts;
    double throttle = 0;
    std::int64_t begin_micros = 0;
    std::int64_t received_bytes = 0;
    std::int64_t read_bytes = 0;
};

template <class T, void (*Free)(T*)>
struct Freed {
    void operator()(T* object) const { Free(object); }
};
using TlsContext = std::unique_ptr<SSL_CTX, Freed<SSL_CTX, SSL_CTX_free>>;
using Tls = std::unique_ptr<SSL, Freed<SSL, SSL_free>>;
using Session = std::unique_ptr<nghttp2_session, Freed<nghttp2_session, nghttp2_session_del>>;

void Require(bool condition, const char* what) {
    if (!condition) {
        throw std::runtime_error(what);
    }
}

TlsContext MakeContext() {
    TlsContext context(SSL_CTX_new(TLS_client_method()));
    Require(context != nullptr, "no TLS");
    constexpr std::array<unsigned char, 3> kProtocols{2, 'h', '2'};
    SSL_CTX_set_alpn_protos(context.get(), kProtocols.data(), kProtocols.size());
    SSL_CTX_set_ciphersuites(context.get(),
                             "TLS_AES_128_GCM_SHA256:TLS_AES_256_GCM_SHA384:TLS_CHACHA20_POLY1305_SHA256");
    SSL_CTX_set_mode(context.get(), SSL_MODE_ENABLE_PARTIAL_WRITE | SSL_MODE_ACCEPT_MOVING_WRITE_BUFFER);
    return context;
}

nghttp2_nv Field(std::string_view name, std::string_view value) {
    const auto bytes = [](std::string_view text) {
        return reinterpret_cast<std::uint8_t*>(const_cast<char*>(text.data()));
    };
    return {bytes(name), bytes(value), name.size(), value.size(), NGHTTP2_NV_FLAG_NONE};
}

// One connection with its streams. Thread safety: one thread.
class Connection {
  public:
    Connection(SSL_CTX* context, const Options& options, int streams, double throttle, Tally& tally)
        : tally_(tally),
          socket_(bench::Connect(options.target)),
          tls_(SSL_new(context)) {
        SSL_set_fd(tls_.get(), socket_.Get());
        Require(SSL_connect(tls_.get()) == 1, "the TLS handshake failed");
        ::fcntl(socket_.Get(), F_SETFL, O_NONBLOCK);
        StartSession();
        streams_.resize(static_cast<std::size_t>(streams));
        streams_.front().throttle = throttle;
        for (Stream& stream : streams_) {
            Ask(stream, options.target);
        }
        Send();
    }
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    int Socket() const { return socket_.Get(); }

    void Receive() {
        std::array<unsigned char, 16384> record{};  // a whole one, so that the TLS library never holds back a rest
        for (int turn = 0; turn < kRecordsInTurn; ++turn) {
            const int got = SSL_read(tls_.get(), record.data(), static_cast<int>(record.size()));
            if (got <= 0) {
                Require(SSL_get_error(tls_.get(), got) == SSL_ERROR_WANT_READ, "the server closed a connection");
                break;
            }
            Require(nghttp2_session_mem_recv(session_.get(), record.data(), static_cast<std::size_t>(got)) == got,
                    "the server broke HTTP/2");
        }
        Send();
    }

    // Reads on what a throttled stream may read by now.
    void Tick() {
        if (Stream& stream = streams_.front(); stream.throttle > 0) {
            const double seconds = static_cast<double>(MonotonicMicros() - stream.begin_micros) / 1e6;
            const std::int64_t allowed =
                std::min(stream.received_bytes, static_cast<std::int64_t>(stream.throttle * seconds));
            Consume(1, static_cast<std::size_t>(std::max<std::int64_t>(allowed - stream.read_bytes, 0)));
            stream.read_bytes = std::max(stream.read_bytes, allowed);
        }
        Send();
    }

  private:
    void StartSession() {
        nghttp2_session_callbacks* callbacks = nullptr;
        nghttp2_option* option = nullptr;
        nghttp2_session* session = nullptr;
        nghttp2_session_callbacks_new(&callbacks);
        nghttp2_option_new(&option);
        nghttp2_option_set_no_auto_window_update(option, 1);
        nghttp2_session_callbacks_set_on_data_chunk_recv_callback(callbacks, OnData);
        nghttp2_session_callbacks_set_on_stream_close_callback(callbacks, OnClose);
        nghttp2_session_client_new2(&session, callbacks, this, option);
        nghttp2_option_del(option);
        nghttp2_session_callbacks_del(callbacks);
        session_.reset(session);
        const std::array<nghttp2_settings_entry, 2> settings{
            {{NGHTTP2_SETTINGS_ENABLE_PUSH, 0}, {NGHTTP2_SETTINGS_INITIAL_WINDOW_SIZE, kStreamWindowBytes}}};
        nghttp2_submit_settings(session, NGHTTP2_FLAG_NONE, settings.data(), settings.size());
        nghttp2_session_set_local_window_size(session, NGHTTP2_FLAG_NONE, 0, kConnectionWindowBytes);
    }

    void Ask(Stream& stream, const bench::Target& target) {
        const std::string path = "/webapi?" + target.query;
        const std::string cookie = "__Host-id=" + target.cookie;
        const std::array<nghttp2_nv, 5> head{Field(":method", "GET"), Field(":scheme", "https"),
                                             Field(":authority", "localhost"), Field(":path", path),
                                             Field("cookie", cookie)};
        stream.begin_micros = MonotonicMicros();
        Require(nghttp2_submit_request(session_.get(), nullptr, head.data(), head.size(), nullptr, &stream) > 0,
                "no request");
    }

    void Consume(std::int32_t id, std::size_t bytes) {
        if (bytes > 0) {
            nghttp2_session_consume(session_.get(), id, bytes);
        }
    }

    // What does not fit into the socket now goes with the next call.
    void Send() {
        for (;;) {
            if (unsent_.empty()) {
                const std::uint8_t* data = nullptr;
                const auto size = nghttp2_session_mem_send(session_.get(), &data);
                if (size <= 0) {
                    return;
                }
                unsent_.assign(reinterpret_cast<const char*>(data), static_cast<std::size_t>(size));
            }
            const int sent = SSL_write(tls_.get(), unsent_.data(), static_cast<int>(unsent_.size()));
            if (sent <= 0) {
                return;
            }
            unsent_.erase(0, static_cast<std::size_t>(sent));
        }
    }

    static int OnData(nghttp2_session* session, std::uint8_t, std::int32_t id, const std::uint8_t* data,
                      std::size_t size, void* self) {
        auto& connection = *static_cast<Connection*>(self);
        auto& stream = *static_cast<Stream*>(nghttp2_session_get_stream_user_data(session, id));
        connection.tally_.bytes += static_cast<std::int64_t>(size);
        stream.received_bytes += static_cast<std::int64_t>(size);
        if (stream.throttle <= 0) {
            stream.parts.Feed(reinterpret_cast<const char*>(data), size, connection.tally_.latencies);
            connection.Consume(id, size);
        }
        return 0;
    }

    static int OnClose(nghttp2_session*, std::int32_t, std::uint32_t, void* self) {
        ++static_cast<Connection*>(self)->tally_.ended;
        return 0;
    }

    Tally& tally_;
    FileDescriptor socket_;
    Tls tls_;
    Session session_;
    std::vector<Stream> streams_;
    std::string unsent_;
};

Options Parse(int count, char** arguments) {
    Options options;
    for (int i = 1; i + 1 < count; i += 2) {
        const std::string name = arguments[i];
        const std::string value = arguments[i + 1];
        if (bench::TakeOption(options.target, name, value)) {
            continue;
        }
        if (name == "--viewers") {
            options.viewers = std::stoi(value);
        } else if (name == "--streams") {
            options.streams = std::stoi(value);
        } else if (name == "--seconds") {
            options.seconds = std::stod(value);
        } else if (name == "--settle") {
            options.settle_seconds = std::stod(value);
        } else if (name == "--throttle") {
            options.throttle = std::stod(value);
        } else {
            throw std::invalid_argument("unknown option " + name);
        }
    }
    return options;
}

std::vector<std::unique_ptr<Connection>> Open(SSL_CTX* context, const Options& options, int poll, Tally& tally) {
    std::vector<std::unique_ptr<Connection>> connections;
    for (int left = options.viewers; left > 0; left -= options.streams) {
        const double throttle = connections.empty() ? options.throttle : 0;
        connections.push_back(
            std::make_unique<Connection>(context, options, std::min(left, options.streams), throttle, tally));
        epoll_event event{};
        event.events = EPOLLIN;
        event.data.ptr = connections.back().get();
        ::epoll_ctl(poll, EPOLL_CTL_ADD, connections.back()->Socket(), &event);
    }
    return connections;
}

int Run(const Options& options) {
    const TlsContext context = MakeContext();
    const FileDescriptor poll(::epoll_create1(EPOLL_CLOEXEC));
    Tally tally;
    std::int64_t start = MonotonicMicros();
    const std::int64_t settled = start + static_cast<std::int64_t>(options.settle_seconds * 1e6);
    const std::int64_t stop = start + static_cast<std::int64_t>(options.seconds * 1e6);
    const auto connections = Open(context.get(), options, poll.Get(), tally);
    std::array<epoll_event, 64> events{};
    for (std::int64_t now = start; now < stop && tally.ended < options.viewers; now = MonotonicMicros()) {
        if (start < settled && now >= settled) {
            start = now;
            tally = Tally();
        }
        const int ready = ::epoll_wait(poll.Get(), events.data(), static_cast<int>(events.size()), 20);
        for (int i = 0; i < ready; ++i) {
            static_cast<Connection*>(events[static_cast<std::size_t>(i)].data.ptr)->Receive();
        }
        for (const auto& connection : connections) {
            connection->Tick();
        }
    }
    std::vector<std::int64_t>& latencies = tally.latencies;
    std::sort(latencies.begin(), latencies.end());
    std::cout << "{\"pictures\":" << latencies.size() << ",\"bytes\":" << tally.bytes << ",\"ended\":" << tally.ended
              << ",\"seconds\":" << static_cast<double>(MonotonicMicros() - start) / 1e6
              << ",\"p50_micros\":" << bench::Percentile(latencies, 0.5)
              << ",\"p99_micros\":" << bench::Percentile(latencies, 0.99)
              << ",\"longest_micros\":" << bench::Percentile(latencies, 1) << "}\n";
    return 0;
}

}  // namespace

int main(int count, char** arguments) try { return Run(Parse(count, arguments)); } catch (const std::exception& error) {
    std::cerr << "bench_browser_viewers: " << error.what() << '\n';
    return 1;
}
