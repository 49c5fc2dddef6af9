// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/console.h"

#include <iostream>

#include <grp.h>
#include <sys/stat.h>
#include <termios.h>
#include <unistd.h>

#include "standalone/base/json_text.h"
#include "standalone/base/state_folder.h"

namespace lookhaven::cli {

namespace {

// Turns off the terminal's echo while it exists.
class EchoOff {
  public:
    EchoOff() {
        ::tcgetattr(STDIN_FILENO, &before_);
        termios silent = before_;
        silent.c_lflag &= ~static_cast<tcflag_t>(ECHO);
        ::tcsetattr(STDIN_FILENO, TCSAFLUSH, &silent);
    }
    EchoOff(const EchoOff&) = delete;
    EchoOff& operator=(const EchoOff&) = delete;
    ~EchoOff() { ::tcsetattr(STDIN_FILENO, TCSAFLUSH, &before_); }

  private:
    termios before_{};
};

std::string ReadLine() {
    std::string line;
    if (!std::getline(std::cin, line) || line.empty()) {
        throw Failure(kDataError, "no password was given: write it to standard input, followed by a newline");
    }
    if (line.back() == '\r') {
        line.pop_back();
    }
    return line;
}

std::string Ask(const std::string& prompt) {
    const EchoOff silence;
    std::cerr << prompt << std::flush;
    std::string line = ReadLine();
    std::cerr << '\n';
    return line;
}

}  // namespace

std::string Console::HomePath() const {
    return home_option.empty() ? base::DefaultHome().string() : home_option;
}

void Console::BecomeOwner() const {
    struct stat home {};
    if (::geteuid() != 0 || ::stat(HomePath().c_str(), &home) != 0 || home.st_uid == 0) {
        return;
    }
    if (::setgroups(0, nullptr) != 0 || ::setresgid(home.st_gid, home.st_gid, home.st_gid) != 0 ||
        ::setresuid(home.st_uid, home.st_uid, home.st_uid) != 0) {
        throw Failure(kNoPermission, "cannot become user ", home.st_uid, ", who owns the state folder ", HomePath());
    }
}

base::Installation Console::Installation() const {
    BecomeOwner();
    const std::string home = HomePath();
    if (::access(home.c_str(), F_OK) != 0) {
        throw Failure(kNoInput, "there is no state folder at ", home,
                      ": create it with lookhaven init, or name another with --home");
    }
    if (::access(home.c_str(), R_OK | X_OK) == 0 && !base::IsStateFolder(home)) {
        throw Failure(kNoInput, "the folder ", home,
                      " is not a state folder: make one with lookhaven init, or name another with --home");
    }
    return base::Installation(home);
}

store::Store Console::OpenStore() const {
    const base::Installation installation = Installation();
    if (::access(installation.Home().c_str(), R_OK | W_OK | X_OK) != 0) {
        throw Failure(kNoPermission, "you have no write access to the state folder ", installation.Home().string(),
                      ": run this as the user who runs the server");
    }
    return store::Store::Open(installation.StoreUrl());
}

void Console::Print(const Json::Value& data, std::string_view text) const {
    std::cout << (json ? base::IndentedJson(data) : text)
              << (json || (!text.empty() && text.back() != '\n') ? "\n" : "");
}

std::string ReadPassword(const std::string& account, bool is_new) {
    if (::isatty(STDIN_FILENO) == 0) {
        return ReadLine();
    }
    std::string password = Ask("Password of " + account + ": ");
    if (is_new && Ask("Repeat the password: ") != password) {
        throw Failure(kDataError, "the two passwords differ: nothing was changed");
    }
    return password;
}

}  // namespace lookhaven::cli
