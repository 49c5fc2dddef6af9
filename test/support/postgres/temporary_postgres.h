// SPDX-License-Identifier: Apache-2.0
//
// A PostgreSQL server of a test's own, on a socket in a temporary folder; gone when the test is, however it ends.
//
// Why so        A watchdog process holds the server: it stops it and removes the folder once its pipe to the test
//               closes, which a crash or a kill of the test does too.
#pragma once

#include <cstdio>
#include <filesystem>
#include <memory>
#include <string>

namespace lookhaven::test {

class TemporaryPostgres {
  public:
    // Starts PostgreSQL 15 and waits until it answers. Throws std::runtime_error when it does not.
    TemporaryPostgres();

    // Makes an empty database and returns its store address.
    std::string NewDatabase();

  private:
    std::filesystem::path folder_;
    struct Close {
        void operator()(std::FILE* pipe) const { ::pclose(pipe); }  // returns when the watchdog has done
    };
    std::unique_ptr<std::FILE, Close> watchdog_;
    int databases_ = 0;
};

}  // namespace lookhaven::test
