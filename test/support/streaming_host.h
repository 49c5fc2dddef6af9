// SPDX-License-Identifier: Apache-2.0
//
// A host that answers each forwarded request with given bytes, for the one source file of a program that includes this.
#pragma once

#include <algorithm>
#include <memory>
#include <span>
#include <string>

#include "standalone/remote/forward.h"

namespace lookhaven::test {

inline std::string streamed;  // in the next answer
inline int stream_status = 200;

// In pieces that end anywhere.
class StreamingHost : public remote::Forwarding {
  public:
    explicit StreamingHost(remote::AnswerSink& sink) : sink_(sink) {}
    bool Step(std::chrono::milliseconds) override {
        remote::AnswerHead head;
        head.status = stream_status;
        if (!has_begun_ && !sink_.Begin(head)) {
            return false;
        }
        has_begun_ = true;
        const std::size_t size = std::min<std::size_t>(left_.size(), 7);
        sink_.Write(std::span(left_).first(size));
        left_.erase(0, size);
        return size > 0 && sink_.WantsMore();
    }
    bool IsComplete() const override { return left_.empty(); }

  private:
    remote::AnswerSink& sink_;
    std::string left_ = streamed;
    bool has_begun_ = false;
};

}  // namespace lookhaven::test

std::unique_ptr<lookhaven::remote::Forwarding> lookhaven::remote::BeginForward(const Host&, const ForwardedRequest&,
                                                                               AnswerSink& sink) {
    return std::make_unique<test::StreamingHost>(sink);
}
