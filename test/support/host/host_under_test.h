// SPDX-License-Identifier: Apache-2.0
//
// Runs the real host program on a state folder of its own, and asks it as a web server would.
#pragma once

#include <map>
#include <string>
#include <vector>

#include <json/json.h>
#include <sys/types.h>

#include "standalone/base/file_descriptor.h"
#include "standalone/base/installation.h"
#include "standalone/store/sessions.h"
#include "test/support/folder.h"
#include "test/support/wait.h"

namespace lookhaven::host {

struct Answer {
    int status = 0;  // 200 without a Status line; 0 when there was no head
    std::map<std::string, std::string> headers;
    std::string body;

    Json::Value Json() const;
};

using test::Eventually;

class HostUnderTest {
  public:
    using Headers = std::map<std::string, std::string>;

    // A fresh folder with the manager "admin" (password "right password") and the viewer "guest", and a running host.
    explicit HostUnderTest(const std::vector<std::string>& options = {}, bool hand_over_socket = false);
    ~HostUnderTest();

    pid_t Pid() const { return pid_; }
    const base::Installation& Home() const { return *home_; }
    // A new session's cookie value and handle.
    store::NewSession LogIn(const std::string& account = "admin") const;

    base::FileDescriptor Connect() const;
    // Connects and sends a GET of Test's method under the session.
    base::FileDescriptor Open(const std::string& method, const std::string& cookie) const;
    // The same for any query.
    base::FileDescriptor OpenQuery(const std::string& query, const std::string& cookie) const;
    base::FileDescriptor Send(const std::string& bytes) const;
    // Sends bytes, then reads to the end of the answer.
    Answer Exchange(const std::string& bytes) const;
    Answer Ask(const std::string& query, const std::string& cookie, Headers headers = {},
               const std::string& body = "") const;
    static Answer ReadAnswer(const base::FileDescriptor& connection);

    // The host's children without its watcher, and its open descriptors.
    std::size_t RequestProcesses() const;
    // Without those that still wait for a request.
    std::vector<pid_t> Children() const;
    std::vector<pid_t> SpareProcesses() const;
    std::size_t Descriptors() const;
    // Ends the host by the signal; returns its wait status.
    int End(int signal);

  private:
    test::TemporaryFolder folder_;
    std::unique_ptr<base::Installation> home_;
    pid_t pid_ = 0;
};

}  // namespace lookhaven::host
