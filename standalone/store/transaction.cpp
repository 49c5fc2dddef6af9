// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/transaction.h"

#include "standalone/store/connection.h"

namespace lookhaven::store {

void InTransaction(Store& store, const std::function<void()>& changes) {
    store.connection().Write([&](soci::session&) { changes(); });
}

}  // namespace lookhaven::store
