// SPDX-License-Identifier: Apache-2.0
//
// Changes of the hosts that share the store.
//
// Failures      Besides what its declaration names, each throws Forbidden, store::NotFound, store::InvalidRecord,
//               store::StoreError, and std::system_error where a file fails; nothing was changed then.
#pragma once

#include <cstdint>
#include <set>
#include <string>

#include <json/json.h>

#include "standalone/admin/actor.h"
#include "standalone/base/installation.h"
#include "standalone/store/hosts.h"

namespace lookhaven::admin {

// Stands for every host where one is named.
constexpr const char* kAnyHost = "any";

// {"id", "name", "address", "port", "version", "draining"}; without the certificate.
Json::Value HostRecord(const store::Host& host);

struct HostPlace {
    std::string name;
    std::string address;  // at which the other hosts reach it
    int port = 0;
};

// Makes this machine a host of its store, with the certificate of its web server and this program's version; one that
// is a host already has these updated. No recorder may run for it. The first host of a store gets the mounts that there
// are. Throws remote::InvalidCertificate.
store::Host AddHost(store::Store& store, const Actor& actor, const base::Installation& installation,
                    const HostPlace& place);

// Whether it gives its floating cameras away.
store::Host DrainHost(store::Store& store, const Actor& actor, const std::string& name, bool draining);

// How many recordings lie on the host's mounts, which only that host can play once it is removed. Shared ones do
// not count.
std::int64_t FootageOf(store::Store& store, int host);

// Removes the host; its mounts and their rows stay. Throws StillNeeded while cameras are fixed to it, and, unless
// confirmed, while recordings lie on its mounts and there are other hosts.
store::Host RemoveHost(store::Store& store, const Actor& actor, const std::string& name, bool confirmed);

// Redistributes the floating cameras: has hosts that have much to do (store/host_loads.h) give some to those that have
// little. Fixed cameras count towards what a host has. Hosts that drain, are full, are among the offline ones or have
// no mount to record to take no part. Returns how many are to move.
int BalanceHosts(store::Store& store, const Actor& actor, const std::set<int>& offline);

// The id of the host of that name, 0 for kAnyHost. Throws store::NotFound.
int HostNamed(store::Store& store, const std::string& name);

// This machine's id among the hosts, for what is to be its own; 0 on a store without hosts. Throws
// store::InvalidRecord where there are hosts and it is not one of them.
int OwnHost(store::Store& store, const base::Installation& installation);

}  // namespace lookhaven::admin
