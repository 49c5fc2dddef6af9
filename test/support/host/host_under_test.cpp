// SPDX-License-Identifier: Apache-2.0
#include "test/support/host/host_under_test.h"

#include <array>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <sstream>

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

#include "standalone/base/clock.h"
#include "standalone/base/file.h"
#include "standalone/base/process.h"
#include "standalone/store/users.h"
#include "test/support/host/scgi_bytes.h"
#include "test/support/process.h"

namespace lookhaven::host {

namespace {

sockaddr_un Address(const std::filesystem::path& path) {
    sockaddr_un address{};
    address.sun_family = AF_UNIX;
    path.string().copy(address.sun_path, sizeof address.sun_path - 1);
    return address;
}

// Opens the listening socket itself, as a service manager does.
int ListenFor(const std::filesystem::path& path) {
    const int listener = socket(AF_UNIX, SOCK_STREAM, 0);
    const sockaddr_un address = Address(path);
    bind(listener, reinterpret_cast<const sockaddr*>(&address), sizeof address);
    listen(listener, 64);
    return listener;
}

[[noreturn]] void Execute(const std::filesystem::path& home, const std::vector<std::string>& options, int listener) {
    std::vector<std::string> words{LOOKHAVEN_WEBAPI, "--home", home.string(), "--module", LOOKHAVEN_TEST_MODULE};
    words.insert(words.end(), options.begin(), options.end());
    std::vector<char*> arguments;
    for (std::string& word : words) {
        arguments.push_back(word.data());
    }
    arguments.push_back(nullptr);
    if (listener >= 0) {
        dup2(listener, 3);
        setenv("LISTEN_FDS", "1", 1);
        setenv("LISTEN_PID", std::to_string(getpid()).c_str(), 1);
    }
    execv(words.front().c_str(), arguments.data());
    _exit(127);
}

std::vector<pid_t> ChildrenOf(pid_t host, bool are_spare) {
    const std::string pid = std::to_string(host);
    std::ifstream list("/proc/" + pid + "/task/" + pid + "/children");
    std::vector<pid_t> children{std::istream_iterator<pid_t>(list), {}};
    std::erase_if(children, [are_spare](pid_t child) {
        std::string name;
        std::getline(std::ifstream("/proc/" + std::to_string(child) + "/comm"), name);
        return (name == "webapi-spare") != are_spare;
    });
    return children;
}

}  // namespace

Json::Value Answer::Json() const {
    ::Json::Value value;
    std::istringstream(body) >> value;
    return value;
}

HostUnderTest::HostUnderTest(const std::vector<std::string>& options, bool hand_over_socket) {
    base::Installation::CreateFolders(folder_);
    home_ = std::make_unique<base::Installation>(folder_);
    store::Store::Migrate(home_->StoreUrl());
    store::Store records = store::Store::Open(home_->StoreUrl());
    store::Users(records).Add("admin", "right password", store::Privilege::kOwner);
    store::Users(records).Add("guest", "other password", store::Privilege::kViewer);
    const int listener = hand_over_socket ? ListenFor(home_->WebApiSocket()) : -1;
    pid_ = fork();
    if (pid_ == 0) {
        Execute(folder_, options, listener);
    }
    close(listener);
    Eventually(std::chrono::seconds(10), [&] { return static_cast<bool>(Connect()); });
}

HostUnderTest::~HostUnderTest() {
    if (pid_ > 0) {
        End(SIGKILL);
    }
}

store::NewSession HostUnderTest::LogIn(const std::string& account) const {
    store::Store records = store::Store::Open(home_->StoreUrl());
    return store::Sessions(records).Create(store::Users(records).FindByName(account).value().id, base::WallSeconds());
}

base::FileDescriptor HostUnderTest::Connect() const {
    base::FileDescriptor connection(socket(AF_UNIX, SOCK_STREAM | SOCK_CLOEXEC, 0));
    const sockaddr_un address = Address(home_->WebApiSocket());
    if (connect(connection.Get(), reinterpret_cast<const sockaddr*>(&address), sizeof address) != 0) {
        connection.Reset();
    }
    return connection;
}

base::FileDescriptor HostUnderTest::Open(const std::string& method, const std::string& cookie) const {
    return OpenQuery("api=Test&version=1&method=" + method, cookie);
}

base::FileDescriptor HostUnderTest::OpenQuery(const std::string& query, const std::string& cookie) const {
    return Send(ScgiBytes({{"REQUEST_METHOD", "GET"}, {"QUERY_STRING", query}, {"HTTP_COOKIE", "id=" + cookie}}));
}

base::FileDescriptor HostUnderTest::Send(const std::string& bytes) const {
    base::FileDescriptor connection = Connect();
    send(connection.Get(), bytes.data(), bytes.size(), MSG_NOSIGNAL);
    return connection;
}

Answer HostUnderTest::Exchange(const std::string& bytes) const {
    return ReadAnswer(Send(bytes));
}

Answer HostUnderTest::Ask(const std::string& query, const std::string& cookie, Headers headers,
                          const std::string& body) const {
    headers.emplace("REQUEST_METHOD", body.empty() ? "GET" : "POST");
    headers.emplace("CONTENT_TYPE", "application/x-www-form-urlencoded");
    headers.emplace("QUERY_STRING", query);
    headers.emplace("REMOTE_ADDR", "192.0.2.7");
    if (!cookie.empty()) {
        headers.emplace("HTTP_COOKIE", "id=" + cookie);
    }
    return Exchange(ScgiBytes(headers, body));
}

Answer HostUnderTest::ReadAnswer(const base::FileDescriptor& connection) {
    const timeval limit{10, 0};
    setsockopt(connection.Get(), SOL_SOCKET, SO_RCVTIMEO, &limit, sizeof limit);
    std::string bytes;
    std::array<char, 4096> block{};
    for (ssize_t got = 0; (got = recv(connection.Get(), block.data(), block.size(), 0)) > 0;) {
        bytes.append(block.data(), static_cast<std::size_t>(got));
    }
    Answer answer;
    const std::size_t end = bytes.find("\r\n\r\n");
    if (end == bytes.npos) {
        return answer;
    }
    answer.status = 200;
    answer.body = bytes.substr(end + 4);
    std::istringstream head(bytes.substr(0, end));
    for (std::string line; std::getline(head, line, '\r'); head.ignore()) {
        const std::size_t colon = line.find(": ");
        answer.headers[line.substr(0, colon)] = line.substr(colon + 2);
    }
    if (answer.headers.contains("Status")) {
        answer.status = std::stoi(answer.headers["Status"]);
    }
    return answer;
}

std::vector<pid_t> HostUnderTest::Children() const {
    return ChildrenOf(pid_, false);
}

std::vector<pid_t> HostUnderTest::SpareProcesses() const {
    return ChildrenOf(pid_, true);
}

std::size_t HostUnderTest::RequestProcesses() const {
    return Children().size() - 1;
}

std::size_t HostUnderTest::Descriptors() const {
    using std::filesystem::directory_iterator;
    return static_cast<std::size_t>(
        std::distance(directory_iterator("/proc/" + std::to_string(pid_) + "/fd"), directory_iterator()));
}

int HostUnderTest::End(int signal) {
    kill(pid_, signal);
    return test::WaitFor(std::exchange(pid_, 0));
}

}  // namespace lookhaven::host
