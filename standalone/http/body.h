// SPDX-License-Identifier: Apache-2.0
//
// The part of a request's body that the host has left on the connection.
//
// Why so        A large body costs something only where its sender is known: the host starts the request's process at
//               the end of the head, and that process reads the body once it has found a session.
#pragma once

#include "standalone/http/request.h"

namespace lookhaven::http {

// Reads the rest of the body from the connection. Throws Failure 408 when it does not arrive within ten seconds, 400
// when the client is gone.
void ReadBody(Request& request, int connection);

// Drops the rest of a body that was not read, for a second at most: a connection that is closed with unread bytes is
// reset, and the client might lose the answer. Call it when the answer is sent and the connection shut down for
// writing.
void DropBody(const Request& request, int connection);

}  // namespace lookhaven::http
