// SPDX-License-Identifier: Apache-2.0
//
// What every command shares: where the installation is, how to answer, how to fail.
#pragma once

#include <stdexcept>
#include <string>
#include <string_view>
#include <vector>

#include <json/json.h>

#include "standalone/base/installation.h"
#include "standalone/store/store.h"

namespace lookhaven::cli {

// The exit codes of sysexits.h, which scripts tell apart.
enum ExitCode : int {
    kOk = 0,
    kFindings = 1,  // the doctor found something
    kUsage = 64,
    kDataError = 65,
    kNoInput = 66,
    kUnavailable = 69,
    kOsError = 71,
    kCannotCreate = 73,
    kNoPermission = 77,
};

// Ends the command with that code and one sentence for the operator.
class Failure : public std::runtime_error {
  public:
    Failure(ExitCode code, const std::string& sentence) : std::runtime_error(sentence), code_(code) {}
    ExitCode Code() const { return code_; }

  private:
    ExitCode code_;
};

using Rows = std::vector<std::vector<std::string>>;

class Console {
  public:
    std::string home_option;  // empty: LOOKHAVEN_HOME, else "var"
    bool json = false;

    std::string HomePath() const;
    // Throws Failure when there is no state folder.
    base::Installation Installation() const;
    // Throws Failure when the state folder is missing or not the caller's to change.
    store::Store OpenStore() const;

    // Answers with the text, or with the data when JSON was asked for.
    void Answer(std::string_view text, const Json::Value& data) const;
};

// The rows under each other in columns; the first row is the head.
std::string Table(const Rows& rows);

std::string ToJson(const Json::Value& value);

// Asks on the terminal without echo (twice when the password is new), or reads one line when standard input is no
// terminal. Throws Failure when there is none.
std::string ReadPassword(const std::string& whose, bool is_new);

}  // namespace lookhaven::cli
