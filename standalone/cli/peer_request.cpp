// SPDX-License-Identifier: Apache-2.0
//
// Invariants    Nothing is sent before the other host has shown the certificate that came with the pairing.
#include "standalone/cli/peer_request.h"

#include <chrono>
#include <csignal>
#include <memory>

#include <netdb.h>
#include <openssl/err.h>
#include <openssl/pem.h>
#include <openssl/ssl.h>
#include <poll.h>
#include <sys/socket.h>

#include "standalone/base/clock.h"
#include "standalone/base/file_descriptor.h"
#include "standalone/cli/console.h"
#include "standalone/remote/certificate.h"
#include "standalone/store/pair_token.h"

namespace lookhaven::cli {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::seconds kMaxDuration{10};
constexpr std::size_t kMaxAnswerBytes = 1 << 20;
constexpr int kMaxChain = 3;

void Await(int socket, short events, Clock::time_point deadline) {
    const auto left = std::chrono::duration_cast<std::chrono::milliseconds>(deadline - Clock::now()).count();
    pollfd ready{socket, events, 0};
    if (left <= 0 || ::poll(&ready, 1, static_cast<int>(left)) <= 0) {
        throw Failure(kUnavailable, "no answer in time");
    }
}

bool Connect(const base::FileDescriptor& socket, const addrinfo& address, Clock::time_point deadline) {
    int error = 0;
    socklen_t size = sizeof error;
    if (::connect(socket.Get(), address.ai_addr, address.ai_addrlen) == 0) {
        return true;
    }
    if (errno != EINPROGRESS) {
        return false;
    }
    Await(socket.Get(), POLLOUT, deadline);
    return ::getsockopt(socket.Get(), SOL_SOCKET, SO_ERROR, &error, &size) == 0 && error == 0;
}

base::FileDescriptor Connect(const store::RecordingServer& server, Clock::time_point deadline) {
    addrinfo hints{};
    hints.ai_socktype = SOCK_STREAM;
    addrinfo* found = nullptr;
    if (::getaddrinfo(server.address.c_str(), std::to_string(server.port).c_str(), &hints, &found) != 0) {
        throw Failure(kUnavailable, "its host name cannot be resolved");
    }
    const std::unique_ptr<addrinfo, decltype(&::freeaddrinfo)> owned(found, ::freeaddrinfo);
    for (const addrinfo* each = found; each != nullptr; each = each->ai_next) {
        base::FileDescriptor socket(::socket(each->ai_family, SOCK_STREAM | SOCK_CLOEXEC | SOCK_NONBLOCK, 0));
        if (socket && Connect(socket, *each, deadline)) {
            return socket;
        }
    }
    throw Failure(kUnavailable, "no connection");
}

class TlsConnection {
  public:
    explicit TlsConnection(const store::RecordingServer& server) : socket_(Connect(server, deadline_)) {
        const std::string name = remote::CertificateName(server.certificate);
        if (!context_ || SSL_CTX_set_min_proto_version(context_.get(), TLS1_2_VERSION) != 1) {
            throw std::bad_alloc();
        }
        Trust(server.certificate);
        SSL_CTX_set_verify(context_.get(), SSL_VERIFY_PEER, nullptr);
        SSL_CTX_set_verify_depth(context_.get(), kMaxChain);
        // The answer is JSON, which cannot be cut unnoticed.
        SSL_CTX_set_options(context_.get(), SSL_OP_IGNORE_UNEXPECTED_EOF);
        connection_.reset(SSL_new(context_.get()));
        if (!connection_ || SSL_set_fd(connection_.get(), socket_.Get()) != 1 ||
            SSL_set1_host(connection_.get(), name.c_str()) != 1 ||
            SSL_set_tlsext_host_name(connection_.get(), name.c_str()) != 1) {
            throw std::bad_alloc();
        }
        Complete("another certificate than its own", [this] { return SSL_connect(connection_.get()); });
    }

    void Send(const std::string& bytes) {
        Complete("it has ended the connection",
                 [&] { return SSL_write(connection_.get(), bytes.data(), static_cast<int>(bytes.size())); });
    }

    // Nothing at the end.
    std::string Receive() {
        std::string bytes(16'384, '\0');
        const int size = Complete("it has ended the connection", [&] {
            return SSL_read(connection_.get(), bytes.data(), static_cast<int>(bytes.size()));
        });
        bytes.resize(static_cast<std::size_t>(size));
        return bytes;
    }

  private:
    // Only these certificates.
    void Trust(const std::string& pem) {
        const std::unique_ptr<BIO, decltype(&BIO_free_all)> text(
            BIO_new_mem_buf(pem.data(), static_cast<int>(pem.size())), BIO_free_all);
        for (;;) {
            const std::unique_ptr<X509, decltype(&X509_free)> certificate(
                PEM_read_bio_X509(text.get(), nullptr, nullptr, nullptr), X509_free);
            if (!certificate) {
                return;
            }
            X509_STORE_add_cert(SSL_CTX_get_cert_store(context_.get()), certificate.get());
        }
    }

    // Repeats the operation until it is done; 0 at the end of what is received.
    template <typename Operation>
    int Complete(const char* failure, Operation operation) {
        for (;;) {
            ERR_clear_error();
            const int result = operation();
            if (result > 0) {
                return result;
            }
            switch (SSL_get_error(connection_.get(), result)) {
            case SSL_ERROR_WANT_READ:
                Await(socket_.Get(), POLLIN, deadline_);
                break;
            case SSL_ERROR_WANT_WRITE:
                Await(socket_.Get(), POLLOUT, deadline_);
                break;
            case SSL_ERROR_ZERO_RETURN:
                return 0;
            default:
                throw Failure(kUnavailable, failure);
            }
        }
    }

    const Clock::time_point deadline_ = Clock::now() + kMaxDuration;
    base::FileDescriptor socket_;
    std::unique_ptr<SSL_CTX, decltype(&SSL_CTX_free)> context_{SSL_CTX_new(TLS_client_method()), SSL_CTX_free};
    std::unique_ptr<SSL, decltype(&SSL_free)> connection_{nullptr, SSL_free};
};

std::string BodyOf(const std::string& answer) {
    const std::size_t head_end = answer.find("\r\n\r\n");
    if (answer.compare(0, 7, "HTTP/1.") != 0 || answer.compare(8, 5, " 200 ") != 0 || head_end == answer.npos) {
        throw Failure(kUnavailable, "it does not let this host in, or is of another version");
    }
    return answer.substr(head_end + 4);
}

}  // namespace

std::string AskPeer(const store::RecordingServer& server, const std::string& secret, const std::string& query) {
    std::signal(SIGPIPE, SIG_IGN);  // OpenSSL writes to a connection that the other host may have ended
    const std::string timestamp = std::to_string(base::WallMillis() / 1000);
    TlsConnection connection(server);
    // In version 1.0 the answer comes in one piece, to the end of the connection.
    connection.Send(Concat("GET /webapi?", query, " HTTP/1.0\r\nHost: ", remote::CertificateName(server.certificate),
                           "\r\nCookie: timestamp=", timestamp, "; token=", store::MakePairToken(secret, timestamp),
                           "\r\n\r\n"));
    std::string answer;
    for (std::string piece = connection.Receive(); !piece.empty(); piece = connection.Receive()) {
        answer += piece;
        if (answer.size() > kMaxAnswerBytes) {
            throw Failure(kUnavailable, "an answer of more than 1 MiB");
        }
    }
    return BodyOf(answer);
}

}  // namespace lookhaven::cli
