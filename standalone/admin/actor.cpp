// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/actor.h"

#include "standalone/store/users.h"

namespace lookhaven::admin {

void RequireManager(store::Store& store, const Actor& actor) {
    if (actor.user_id == 0) {
        return;
    }
    if (const auto user = store::Users(store).Find(actor.user_id); !user || !user->IsManager()) {
        throw Forbidden("only a manager may do this");
    }
}

}  // namespace lookhaven::admin
