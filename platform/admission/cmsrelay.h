// SPDX-License-Identifier: Apache-2.0
//
// Records of a request that a managing host relays to its recording servers.
#pragma once

// What to relay. The module names the type in its handlers' identity and never fills one.
struct CmsRelayParams;

// Whom to relay to. As above.
struct CmsRelayTarget;
