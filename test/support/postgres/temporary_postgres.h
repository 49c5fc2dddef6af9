// SPDX-License-Identifier: Apache-2.0
//
// A PostgreSQL server of a test's own, on a socket in a temporary folder; gone when the test is, however it ends.
//
// Why so        A guardian process holds the server: it stops it and removes the folder once its pipe to the test
//               closes, which a crash or a kill of the test does too.
#pragma once

#include <filesystem>
#include <string>

#include <sys/types.h>

#include "standalone/base/file_descriptor.h"

namespace lookhaven::test {

class TemporaryPostgres {
  public:
    // Starts PostgreSQL 15 and waits until it answers. Throws std::runtime_error when it does not. Call it from a
    // process with one thread.
    TemporaryPostgres();
    ~TemporaryPostgres();

    // Makes an empty database and returns its store address.
    std::string NewDatabase();

  private:
    std::filesystem::path folder_;
    base::FileDescriptor alive_;  // the guardian sees its end
    pid_t guardian_ = 0;
    int databases_ = 0;
};

}  // namespace lookhaven::test
