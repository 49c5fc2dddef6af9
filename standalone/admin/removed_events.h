// SPDX-License-Identifier: Apache-2.0
//
// Deletes single recordings, alerts and POS transactions, as somebody's privacy may demand; the audit log tells who
// did.
#pragma once

#include <optional>
#include <span>

#include "standalone/admin/actor.h"
#include "standalone/store/marks.h"
#include "standalone/store/store.h"

namespace lookhaven::admin {

// Recordings, a mark with its text, or both, all or nothing. No search finds them once this returns; the
// recorder that maintains their mount then deletes the recordings' files, within seconds while it runs, with the
// marks that have no other footage. Throws StillNeeded where one is kept or still being recorded, or the mark's
// footage may still come; and what Apply throws. Where the mark's span file stays, that is only logged.
void RemoveEvents(store::Store& store, const Actor& actor, std::span<const store::Event> recordings,
                  const std::optional<store::Mark>& mark);

}  // namespace lookhaven::admin
