// SPDX-License-Identifier: Apache-2.0
//
// Starts threads: one that cannot be started is logged and can be tried again, and keeps no other from starting.
#pragma once

#include <exception>
#include <map>
#include <string>
#include <utility>

#include "standalone/base/log.h"

namespace lookhaven::recorder {

class StartAttempts {
  public:
    // Calls start(); an exception is logged as that of starting `what`, each reason once until it succeeds.
    template <class Work>
    void Try(const std::string& what, Work&& start) {
        try {
            start();
            reported_failures_.erase(what);
        } catch (const std::exception& failure) {
            if (std::exchange(reported_failures_[what], failure.what()) != failure.what()) {
                base::LogError("cannot start the " + what + ": " + failure.what());
            }
        }
    }

  private:
    std::map<std::string, std::string> reported_failures_;
};

}  // namespace lookhaven::recorder
