// SPDX-License-Identifier: Apache-2.0
//
// Several changes as one transaction.
#pragma once

#include <functional>

#include "standalone/store/store.h"

namespace lookhaven::store {

// Makes all the changes that the function makes by the store's record classes, or, when it throws, none of them.
// Throws StoreError, and what the changes throw.
void InTransaction(Store& store, const std::function<void()>& changes);

}  // namespace lookhaven::store
