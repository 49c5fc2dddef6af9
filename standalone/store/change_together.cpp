// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/change_together.h"

#include "standalone/store/connection.h"

namespace lookhaven::store {

void ChangeTogether(Store& store, const std::function<void()>& changes) {
    store.connection().Write([&](soci::session&) { changes(); });
}

}  // namespace lookhaven::store
