// SPDX-License-Identifier: Apache-2.0
//
// The record that recorder and request processes share, as this process has it mapped.
#pragma once

#include "platform/export.h"

namespace lookhaven::binding {

// For a process that is about to decode: others' lock lies in the record. What platform/ gave out of it is invalid
// afterwards; the next to ask for it has it mapped anew.
LH_PLATFORM_API void ReleaseCommonRecord();

}  // namespace lookhaven::binding
