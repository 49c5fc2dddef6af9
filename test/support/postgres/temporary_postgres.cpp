// SPDX-License-Identifier: Apache-2.0
#include "test/support/postgres/temporary_postgres.h"

#include <chrono>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <grp.h>
#include <pwd.h>
#include <sys/wait.h>
#include <unistd.h>

namespace lookhaven::test {

namespace {

const std::filesystem::path kPrograms = "/usr/lib/postgresql/15/bin";
constexpr std::chrono::seconds kStartDeadline{60};

// PostgreSQL refuses to run as root.
const passwd* ServerUser() {
    if (::geteuid() != 0) {
        return nullptr;
    }
    const passwd* user = ::getpwnam("postgres");
    if (user == nullptr) {
        throw std::runtime_error("the store's tests need PostgreSQL 15 and its user postgres");
    }
    return user;
}

pid_t Start(const std::filesystem::path& folder, const std::string& program, std::vector<std::string> arguments) {
    const passwd* user = ServerUser();
    const pid_t child = ::fork();
    if (child != 0) {
        return child;
    }
    if (user != nullptr && (::initgroups(user->pw_name, user->pw_gid) != 0 || ::setgid(user->pw_gid) != 0 ||
                            ::setuid(user->pw_uid) != 0)) {
        _exit(126);
    }
    const int log = ::open((folder / "log").c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
    ::dup2(log, STDOUT_FILENO);
    ::dup2(log, STDERR_FILENO);
    const std::string path = kPrograms / program;
    arguments.insert(arguments.begin(), program);
    std::vector<char*> argv;
    for (std::string& argument : arguments) {
        argv.push_back(argument.data());
    }
    argv.push_back(nullptr);
    if (::chdir(folder.c_str()) == 0) {
        ::execv(path.c_str(), argv.data());
    }
    _exit(127);
}

bool Succeeds(pid_t child) {
    int status = 0;
    return ::waitpid(child, &status, 0) == child && status == 0;
}

std::string ReadAll(const std::filesystem::path& path) {
    std::ifstream file(path);
    return {std::istreambuf_iterator<char>(file), {}};
}

// Never returns: keeps the server until the pipe ends, then removes every trace.
[[noreturn]] void Guard(const std::filesystem::path& folder, int pipe_end) {
    ::setpgid(0, 0);
    const std::filesystem::path data = folder / "data";
    const pid_t server =
        Start(folder, "postgres",
              {"-D", data, "-k", folder, "-c", "listen_addresses=", "-c", "fsync=off", "-c", "max_connections=50"});
    char byte = 0;
    while (::read(pipe_end, &byte, 1) < 0 && errno == EINTR) {
    }
    ::kill(server, SIGINT);  // PostgreSQL's fast shutdown
    ::waitpid(server, nullptr, 0);
    std::error_code ignored;
    std::filesystem::remove_all(folder, ignored);
    _exit(0);
}

}  // namespace

TemporaryPostgres::TemporaryPostgres() {
    std::string pattern = std::filesystem::temp_directory_path() / "lookhaven-postgres-XXXXXX";
    folder_ = ::mkdtemp(pattern.data());
    if (const passwd* user = ServerUser();
        user != nullptr && ::chown(folder_.c_str(), user->pw_uid, user->pw_gid) != 0) {
        throw std::runtime_error("cannot hand the folder to PostgreSQL");
    }
    if (!Succeeds(Start(folder_, "initdb",
                        {"-D", folder_ / "data", "-A", "trust", "-U", "postgres", "-N", "-E", "UTF8", "--locale=C"}))) {
        const std::string log = ReadAll(folder_ / "log");
        std::filesystem::remove_all(folder_);
        throw std::runtime_error("initdb of PostgreSQL 15 failed: " + log);
    }
    int ends[2] = {-1, -1};
    if (::pipe2(ends, O_CLOEXEC) != 0) {
        throw std::runtime_error("no pipe");
    }
    alive_.Reset(ends[1]);
    guardian_ = ::fork();
    if (guardian_ == 0) {
        alive_.Reset();
        Guard(folder_, ends[0]);
    }
    ::close(ends[0]);
    const auto deadline = std::chrono::steady_clock::now() + kStartDeadline;
    while (ReadAll(folder_ / "data" / "postmaster.pid").find("ready") == std::string::npos) {
        if (std::chrono::steady_clock::now() > deadline) {
            throw std::runtime_error("PostgreSQL does not start: " + ReadAll(folder_ / "log"));
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
}

TemporaryPostgres::~TemporaryPostgres() {
    alive_.Reset();
    ::waitpid(guardian_, nullptr, 0);
}

std::string TemporaryPostgres::NewDatabase() {
    const std::string name = "test" + std::to_string(++databases_);
    if (!Succeeds(Start(folder_, "createdb", {"-h", folder_, "-U", "postgres", name}))) {
        throw std::runtime_error("createdb failed: " + ReadAll(folder_ / "log"));
    }
    return "postgresql:host=" + folder_.string() + " user=postgres dbname=" + name;
}

}  // namespace lookhaven::test
