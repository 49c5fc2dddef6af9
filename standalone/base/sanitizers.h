// SPDX-License-Identifier: Apache-2.0
//
// Whether this build has a sanitizer, which needs more of the system than our own code does.
#pragma once

namespace lookhaven::base {

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kSanitized = true;
#elif defined(__has_feature)
#if __has_feature(address_sanitizer) || __has_feature(thread_sanitizer)
constexpr bool kSanitized = true;
#else
constexpr bool kSanitized = false;
#endif
#else
constexpr bool kSanitized = false;
#endif

}  // namespace lookhaven::base
