// SPDX-License-Identifier: Apache-2.0
//
// What may name a host in an address, and what this one is called.
#pragma once

#include <string>
#include <string_view>

namespace lookhaven::base {

// A host name of RFC 1123 (an underscore may stand in it too), an IPv4 address in four numbers, or an IPv6 address
// without brackets and zone. Says nothing of whether there is such a host.
bool IsHost(std::string_view text);

// "host", "host:8080", "[2001:db8::1]:8080": a host, and a port from 1 to 65535 where one is given.
bool IsHostAndPort(std::string_view text);

// This host's name, as the system has it.
std::string OwnHostName();

}  // namespace lookhaven::base
