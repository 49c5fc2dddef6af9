// SPDX-License-Identifier: Apache-2.0
#include "standalone/remote/forward.h"
#include "standalone/remote/library.h"

namespace lookhaven::remote {

std::unique_ptr<Forwarding> BeginForward(const Host& host, const ForwardedRequest& request, AnswerSink& sink) {
    const auto begin = reinterpret_cast<decltype(&LookhavenBeginForward)>(FindInLibrary("LookhavenBeginForward"));
    return std::unique_ptr<Forwarding>(begin(host, request, sink));
}

bool Forward(const Host& host, const ForwardedRequest& request, AnswerSink& sink) {
    return Finish(*BeginForward(host, request, sink));
}

}  // namespace lookhaven::remote
