// SPDX-License-Identifier: Apache-2.0
#include "standalone/maintenance/deletion.h"

#include <algorithm>
#include <exception>
#include <filesystem>
#include <map>
#include <optional>
#include <string>
#include <system_error>
#include <vector>

#include "standalone/archive/layout.h"
#include "standalone/archive/recording_log.h"
#include "standalone/base/log.h"
#include "standalone/store/shared_mounts.h"

namespace lookhaven::maintenance {

namespace {

constexpr std::size_t kEventsPerBatch = 100;
constexpr int kMarksPerBatch = 100;

std::vector<int> IdsOf(std::span<const store::Event> events) {
    std::vector<int> ids;
    for (const store::Event& event : events) {
        ids.push_back(event.id);
    }
    return ids;
}

}  // namespace

void Deletion::Delete(std::span<const store::Event> events) {
    if (!events.empty()) {
        Change([&] { events_.BeginDeletion(IdsOf(events)); });
        Finish();
    }
}

void Deletion::Finish() {
    const std::vector<store::Event> pending = events_.PendingDeletion(mount_.id);
    std::size_t removed = 0;
    std::exception_ptr failure;
    try {
        for (; removed < pending.size(); ++removed) {
            if (removed % kEventsPerBatch == 0) {
                Change([] {});  // whether this host still may
            }
            RemoveFile(pending[removed]);
        }
    } catch (const std::system_error&) {
        // Before any is forgotten: the seconds and marks that they share with others stay.
        failure = std::current_exception();
        Change([&] { events_.CancelDeletion(IdsOf(std::span(pending).subspan(removed))); });
    }
    for (std::span rest = std::span(pending).first(removed); !rest.empty();) {
        const std::span page = rest.first(std::min(rest.size(), kEventsPerBatch));
        Forget(page);
        rest = rest.subspan(page.size());
    }
    if (failure) {
        std::rethrow_exception(failure);
    }
}

void Deletion::Change(const std::function<void()>& change) {
    if (mount_.IsShared()) {
        store::SharedMounts(store_).ChangeWithLease(mount_.id, host_, change);
    } else {
        change();
    }
}

void Deletion::Forget(std::span<const store::Event> events) {
    std::map<int, std::int64_t> ends_s;  // of what each camera has lost
    for (const store::Event& event : events) {
        ++result_.events;
        result_.bytes += event.size_bytes;
        // What a wrong clock dated ahead says nothing about the marks before it.
        if (event.end_s <= now_s_) {
            ends_s[event.camera_id] = std::max(ends_s[event.camera_id], event.end_s);
        }
        ClearRecordingLog(event);
    }
    for (const auto& [camera, end_s] : ends_s) {
        RemoveMarks(camera, end_s);
    }
    for (const store::Event& event : events) {
        if (archive::DayOf(event.start_s) != archive::DayOf(now_s_)) {
            folder_.RemoveDayIfEmpty(event.camera_id, event.start_s);
        }
    }
    events_.FinishDeletion(IdsOf(events));
}

void Deletion::RemoveFile(const store::Event& event) {
    const std::optional<archive::FileName> name = archive::ParsePath(event.path);
    if (name && name->kind == archive::FileKind::kRecording) {
        folder_.Remove(*name);
    } else {
        base::LogWarning("the path of event " + std::to_string(event.id) + " names no recording: left alone");
    }
}

bool Deletion::HasFootage(int camera, std::int64_t begin_s, std::int64_t end_s) {
    store::EventFilter filter;
    filter.camera_ids = {camera};
    filter.begin_s = begin_s;
    filter.end_s = std::max(end_s, begin_s + 1);
    filter.limit = 1;
    return !events_.List(filter).empty();
}

void Deletion::RemoveMarks(int camera, std::int64_t end_s) {
    std::vector<store::Mark> page;
    store::Mark last;
    do {
        page = marks_.EndedBy(camera, end_s, last, kMarksPerBatch);
        for (const store::Mark& mark : page) {
            last = mark;
            if (!HasFootage(camera, mark.start_s, mark.end_s)) {
                RemoveMark(mark);
            }
        }
    } while (page.size() == kMarksPerBatch);
}

void Deletion::RemoveMark(const store::Mark& mark) {
    try {
        if (RemoveSpan(mark)) {
            marks_.Remove(mark.id);
            ++result_.marks;
        }
    } catch (const std::system_error& failure) {  // its file may lie on another mount
        base::LogWarning("mark " + std::to_string(mark.id) + " stays: " + failure.what());
    }
}

bool Deletion::RemoveSpan(const store::Mark& mark) {
    const std::optional<archive::FileName> name = archive::ParsePath(mark.path);
    if (mark.state != store::MarkState::kSaved || !name || name->kind != archive::FileKind::kSpan) {
        return true;
    }
    if (mark.mount_id == mount_.id) {
        folder_.Remove(*name);
        return true;
    }
    const std::optional<store::Mount> other = mounts_.Find(mark.mount_id);
    const std::optional<MountFolder> folder = other ? OpenMount(store_, *other) : std::optional<MountFolder>();
    if (folder) {
        folder->Remove(*name);
    }
    return folder.has_value();
}

void Deletion::ClearRecordingLog(const store::Event& event) {
    const std::filesystem::path camera = folder_.Path() / std::to_string(event.camera_id);
    std::int64_t end_s = event.end_s;
    while (end_s > event.start_s && HasFootage(event.camera_id, end_s - 1, end_s)) {
        --end_s;
    }
    std::int64_t begin_s = event.start_s;
    while (begin_s < end_s && HasFootage(event.camera_id, begin_s, begin_s + 1)) {
        ++begin_s;
    }
    if (begin_s >= end_s || !folder_.HasDay(event.camera_id, begin_s)) {
        return;
    }
    try {
        archive::WriteRecordingLog(camera, begin_s, end_s, 0);
    } catch (const std::system_error& failure) {
        base::LogWarning(std::string("the recording log still shows deleted footage: ") + failure.what());
    }
}

}  // namespace lookhaven::maintenance
