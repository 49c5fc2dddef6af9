// SPDX-License-Identifier: Apache-2.0
//
// A request's process as the module sees it: a caller, a store, and signals of the host.
#pragma once

#include <chrono>
#include <csignal>

#include <gtest/gtest.h>
#include <sys/time.h>

#include "standalone/binding/request_context.h"
#include "standalone/store/users.h"
#include "test/support/folder.h"

namespace lookhaven::binding {

class Binding : public testing::Test {
  protected:
    Binding() {
        store::Users users(records_);
        users.Add("admin", "long enough", store::Privilege::kOwner);
        users.Add("guest", "long enough", store::Privilege::kViewer);
        Call(1);
    }
    ~Binding() override { Call(0); }

    void Call(unsigned int user) const {
        RequestContext& context = RequestContext::Current();
        context.CloseRecords();
        context.Begin(home_, nullptr);
        context.SetCaller(user);
        context.Restrict({});
    }

    const test::TemporaryFolder folder_;
    const base::Installation home_{(base::Installation::CreateFolders(folder_), folder_)};
    store::Store records_{(store::Store::Migrate(home_.StoreUrl()), store::Store::Open(home_.StoreUrl()))};
};

// Sends this process a signal every so often, as a host does.
class Ticks {
  public:
    explicit Ticks(std::chrono::microseconds period) {
        struct sigaction action {};
        action.sa_handler = [](int) {};
        sigaction(SIGALRM, &action, nullptr);
        Set(period);
    }
    ~Ticks() { Set(std::chrono::microseconds(0)); }

  private:
    static void Set(std::chrono::microseconds period) {
        const itimerval timer{{0, period.count()}, {0, period.count()}};
        setitimer(ITIMER_REAL, &timer, nullptr);
    }
};

}  // namespace lookhaven::binding
