// SPDX-License-Identifier: Apache-2.0
#include "standalone/recorder/pre_record_buffer.h"

#include <algorithm>
#include <utility>

namespace lookhaven::recorder {

namespace {

bool BeginsGroup(const Frame& frame) {
    return frame.medium == base::Medium::kVideo && frame.key_frame;
}

}  // namespace

void PreRecordBuffer::Add(Frame frame, std::int64_t seconds) {
    if (!frames_.empty() && frames_.front().format != frame.format) {
        TakeAll();
    }
    if (frames_.empty() && !BeginsGroup(frame)) {
        return;
    }
    bytes_ += frame.data.size();
    const std::int64_t from_us = frame.timestamp_us - seconds * 1'000'000;
    frames_.push_back(std::move(frame));
    for (const Frame* next = SecondKeyFrame(); next != nullptr && next->timestamp_us <= from_us;
         next = SecondKeyFrame()) {
        DropFirstGroup();
    }
    while (bytes_ > kCapacityBytes) {
        DropFirstGroup();
    }
}

std::deque<Frame> PreRecordBuffer::TakeAll() {
    bytes_ = 0;
    return std::exchange(frames_, {});
}

void PreRecordBuffer::DropFirstGroup() {
    do {
        bytes_ -= frames_.front().data.size();
        frames_.pop_front();
    } while (!frames_.empty() && !BeginsGroup(frames_.front()));
}

const Frame* PreRecordBuffer::SecondKeyFrame() const {
    const auto next = frames_.empty() ? frames_.end() : std::find_if(frames_.begin() + 1, frames_.end(), BeginsGroup);
    return next == frames_.end() ? nullptr : &*next;
}

}  // namespace lookhaven::recorder
