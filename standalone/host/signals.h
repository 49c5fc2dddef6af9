// SPDX-License-Identifier: Apache-2.0
//
// Signals of the host: none interrupts it, and the two that end it come through a descriptor.
#pragma once

#include "standalone/base/file_descriptor.h"

namespace lookhaven::host {

// Blocks all signals of this thread, and those that it starts; none is ignored any more, which request processes would
// inherit. The result becomes readable, as a signalfd, on SIGTERM and SIGINT; invalid, with errno set, when there is
// none.
base::FileDescriptor BlockSignals();

}  // namespace lookhaven::host
