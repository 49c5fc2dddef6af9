// SPDX-License-Identifier: Apache-2.0
//
// Records of a request that a managing host relays to its recording servers. The module only names them in the types of
// its handlers: it never fills one, so nobody needs to define them.
#pragma once

// The request to relay.
struct CmsRelayParams;

// The server to relay it to.
struct CmsRelayTarget;
