// SPDX-License-Identifier: Apache-2.0
#include "standalone/base/version.h"

namespace lookhaven::base {

const char* const kVersion = LOOKHAVEN_VERSION;

}  // namespace lookhaven::base
