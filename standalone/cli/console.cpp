// SPDX-License-Identifier: Apache-2.0
#include "standalone/cli/console.h"

#include <algorithm>
#include <cstdlib>
#include <iostream>

#include <termios.h>
#include <unistd.h>

namespace lookhaven::cli {

namespace {

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
        throw Failure(kDataError, "no password was given: write it to standard input, followed by a line break");
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

// How many columns the text takes, for the scripts in which cameras are mostly named.
std::size_t Width(std::string_view text) {
    return static_cast<std::size_t>(
        std::count_if(text.begin(), text.end(), [](char c) { return (static_cast<unsigned char>(c) >> 6) != 2; }));
}

}  // namespace

std::string Console::HomePath() const {
    if (!home_option.empty()) {
        return home_option;
    }
    const char* home = std::getenv("LOOKHAVEN_HOME");
    return home != nullptr && *home != '\0' ? home : "var";
}

base::Installation Console::Installation() const {
    const std::string home = HomePath();
    if (::access(home.c_str(), F_OK) != 0) {
        throw Failure(kNoInput, "there is no state folder at " + home +
                                    ": make one with lookhaven init, or name another with --home");
    }
    return base::Installation(home);
}

store::Store Console::OpenStore() const {
    const base::Installation installation = Installation();
    if (::access(installation.Home().c_str(), R_OK | W_OK | X_OK) != 0) {
        throw Failure(kNoPermission, "the state folder " + installation.Home().string() +
                                         " cannot be written by you: run this as the user who runs the server");
    }
    return store::Store::Open(installation.StoreUrl());
}

void Console::Answer(std::string_view text, const Json::Value& data) const {
    std::cout << (json ? ToJson(data) : text) << (json || (!text.empty() && text.back() != '\n') ? "\n" : "");
}

std::string Table(const Rows& rows) {
    std::vector<std::size_t> widths;
    for (const auto& row : rows) {
        widths.resize(std::max(widths.size(), row.size()));
        for (std::size_t i = 0; i < row.size(); ++i) {
            widths[i] = std::max(widths[i], Width(row[i]));
        }
    }
    std::string text;
    for (const auto& row : rows) {
        for (std::size_t i = 0; i < row.size(); ++i) {
            text += row[i];
            text += i + 1 < row.size() ? std::string(widths[i] - Width(row[i]) + 2, ' ') : "\n";
        }
    }
    return text;
}

std::string ToJson(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "  ";
    builder["emitUTF8"] = true;
    return Json::writeString(builder, value);
}

std::string ReadPassword(const std::string& whose, bool is_new) {
    if (::isatty(STDIN_FILENO) == 0) {
        return ReadLine();
    }
    std::string password = Ask("Password of " + whose + ": ");
    if (is_new && Ask("The same again: ") != password) {
        throw Failure(kDataError, "the two passwords differ: nothing was changed");
    }
    return password;
}

}  // namespace lookhaven::cli
