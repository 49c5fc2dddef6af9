// SPDX-License-Identifier: Apache-2.0
//
// The recorder lease: of all recorders that reach the store, only the lease's holder records the store's cameras.
// Where hosts share the store (hosts.h), each has a lease of its own, for its own recorder.
//
// Why so        Two recorders on one store would record every camera twice. The clocks of two hosts cannot be compared,
//               so the holder counts up, and others take the lease over once the count has not changed for a while by
//               their own clock.
#pragma once

#include <cstdint>
#include <optional>
#include <string>

#include "standalone/base/installation.h"
#include "standalone/store/store.h"

namespace lookhaven::store {

struct LeaseState {
    std::string holder;         // empty while nobody has it
    std::int64_t count = 0;     // grows whenever the holder renews it
    int first_reserved_id = 0;  // event ids from here on may be in the holder's reserve

    friend bool operator==(const LeaseState&, const LeaseState&) = default;
};

// The holder's name, "/var/lib/lookhaven on nvr1": the same after a restart, another on each host.
std::string RecorderName(const base::Installation& installation);

// What holds for all recorders of the store, those of hosts included: some holder, and the lowest reserved id.
LeaseState AnyRecorder(Store& store);

class RecorderLease {
  public:
    // host: whose lease; 0: the only one, of a store without hosts. The store must outlive this object.
    explicit RecorderLease(Store& store, int host = 0);

    // For an unknown host: one without a holder, which cannot be taken.
    LeaseState Current();
    // Takes or renews the lease if its count is still that one. False when somebody else was faster.
    bool Take(std::int64_t count, const std::string& holder, int first_reserved_id);
    // Gives the lease back, so that another recorder need not wait; does nothing when it is no longer the holder's with
    // that count.
    void Release(std::int64_t count, const std::string& holder);

  private:
    Connection& connection_;
    const int host_;
};

}  // namespace lookhaven::store
