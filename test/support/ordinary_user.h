// SPDX-License-Identifier: Apache-2.0
//
// A user to whom file permissions apply.
#pragma once

#include <gtest/gtest.h>
#include <unistd.h>

namespace lookhaven::test {

// Root may pass every permission: takes that away from all threads until destruction.
class OrdinaryUser {
  public:
    OrdinaryUser() { EXPECT_TRUE(::geteuid() != 0 || ::seteuid(65534) == 0); }
    OrdinaryUser(const OrdinaryUser&) = delete;
    OrdinaryUser& operator=(const OrdinaryUser&) = delete;
    ~OrdinaryUser() { EXPECT_EQ(::seteuid(::getuid()), 0); }
};

}  // namespace lookhaven::test
