// SPDX-License-Identifier: Apache-2.0
//
// What every command shares: where the installation is, how to answer, how to fail.
#pragma once

#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>

#include "standalone/base/concat.h"
#include "standalone/base/installation.h"
#include "standalone/cli/json.h"
#include "standalone/store/store.h"

namespace lookhaven::cli {

// The exit codes of sysexits.h, which scripts tell apart.
enum ExitCode : int {
    kOk = 0,
    kFindings = 1,  // the doctor or verify found something
    kUnproven = 2,  // nothing speaks against the export, but it is not signed by a known key
    kUsage = 64,
    kDataError = 65,
    kNoInput = 66,
    kUnavailable = 69,
    kOsError = 71,
    kCannotCreate = 73,
    kNoPermission = 77,
    kConfigError = 78,  // store's schema or configuration file not valid for this program
};

using base::Concat;

// Ends the command with that code and one sentence for the operator, made of the parts.
class Failure : public std::runtime_error {
  public:
    template <typename... Parts>
    explicit Failure(ExitCode code, const Parts&... parts) : std::runtime_error(Concat(parts...)),
                                                             code_(code) {}
    ExitCode Code() const { return code_; }

  private:
    ExitCode code_;
};

// The record that was looked up; without one, throws Failure kNoInput with the parts for a sentence.
template <typename Record, typename... Parts>
Record Require(std::optional<Record> record, const Parts&... parts) {
    if (!record) {
        throw Failure(kNoInput, parts...);
    }
    return *std::move(record);
}

class Console {
  public:
    std::string home_option;  // empty: the default
    bool json = false;

    std::string HomePath() const;
    // Root becomes the owner of the state folder for good, so that it leaves no files there that the server, which runs
    // as that user, could not use. Does nothing where there is no folder yet. Throws Failure.
    void BecomeOwner() const;
    // BecomeOwner first. Throws Failure when there is no folder, or one of something else.
    base::Installation Installation() const;
    // Throws Failure when the state folder is missing or not the caller's to change.
    store::Store OpenStore() const;

    // Answers with the data when JSON was asked for, else with the text, which is made of the parts.
    template <typename... Parts>
    void Answer(const Json::Value& data, const Parts&... parts) const {
        Print(data, Concat(parts...));
    }

  private:
    void Print(const Json::Value& data, std::string_view text) const;
};

// Asks on the terminal without echo (twice when the password is new), or reads one line when standard input is no
// terminal. Throws Failure when there is none.
std::string ReadPassword(const std::string& account, bool is_new);

}  // namespace lookhaven::cli
