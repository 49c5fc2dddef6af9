// SPDX-License-Identifier: Apache-2.0
#include "test/support/postgres/temporary_postgres.h"

#include <chrono>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <stdexcept>
#include <thread>

#include <unistd.h>

namespace lookhaven::test {

namespace {

constexpr std::chrono::seconds kStartDeadline{60};

// PostgreSQL refuses to run as root. The watchdog has a session of its own, so that Ctrl-C reaches the test alone; it
// stops the server and removes the folder when its input ends.
constexpr const char* kWatchdog = R"sh(exec setsid sh -c '
    cd "$0" && exec >log 2>&1
    as= programs=/usr/lib/postgresql/15/bin
    [ "$(id -u)" != 0 ] || { chown postgres . && as="setpriv --reuid postgres --regid postgres --init-groups"; }
    if $as $programs/initdb -D data -A trust -U postgres -N -E UTF8 --locale=C; then
        $as $programs/postgres -D data -k "$0" -c listen_addresses= -c fsync=off -c max_connections=50 </dev/null &
        read -r end
        kill -INT $!
        wait
    else
        touch failed
        read -r end
    fi
    rm -rf "$0"
' )sh";

std::string ReadAll(const std::filesystem::path& path) {
    std::ifstream file(path);
    return {std::istreambuf_iterator<char>(file), {}};
}

}  // namespace

TemporaryPostgres::TemporaryPostgres() {
    std::string pattern = std::filesystem::temp_directory_path() / "lookhaven-postgres-XXXXXX";
    folder_ = ::mkdtemp(pattern.data());
    watchdog_.reset(::popen((kWatchdog + folder_.string()).c_str(), "we"));
    const auto deadline = std::chrono::steady_clock::now() + kStartDeadline;
    while (ReadAll(folder_ / "data" / "postmaster.pid").find("ready") == std::string::npos) {
        if (std::filesystem::exists(folder_ / "failed") || std::chrono::steady_clock::now() > deadline) {
            throw std::runtime_error("PostgreSQL 15 does not start: " + ReadAll(folder_ / "log"));
        }
        std::this_thread::sleep_for(std::chrono::milliseconds(20));
    }
}

std::string TemporaryPostgres::NewDatabase() {
    const std::string name = "test" + std::to_string(++databases_);
    const std::string command = "/usr/lib/postgresql/15/bin/createdb -h " + folder_.string() + " -U postgres " + name;
    if (std::system(command.c_str()) != 0) {
        throw std::runtime_error("createdb failed: " + ReadAll(folder_ / "log"));
    }
    return "postgresql:host=" + folder_.string() + " user=postgres dbname=" + name;
}

}  // namespace lookhaven::test
