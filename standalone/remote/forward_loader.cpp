// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/forward.h"
#include "standalone/remote/library.h"

namespace lookhaven::remote {

bool Forward(const Host& host, const ForwardedRequest& request, AnswerSink& sink) {
    return reinterpret_cast<decltype(&LookhavenForward)>(FindInLibrary("LookhavenForward"))(host, request, sink);
}

}  // namespace lookhaven::remote
