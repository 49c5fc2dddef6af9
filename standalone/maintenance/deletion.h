// SPDX-License-Identifier: Apache-2.0
//
// Deletes recorded events of one mount: rows, files, what the recording log says of them, and marks without footage.
//
// Invariants    (1) A row becomes pending deletion, where no search finds it, its file is removed, then the row. A file
//                   that cannot be removed gets its row back; what a crash leaves in between is finished by Finish.
//               (2) A mark is removed with the last of its footage.
// Thread safety One thread.
#pragma once

#include <cstdint>
#include <functional>
#include <span>

#include "standalone/maintenance/mount_folder.h"
#include "standalone/store/events.h"
#include "standalone/store/marks.h"
#include "standalone/store/mounts.h"
#include "standalone/store/store.h"

namespace lookhaven::maintenance {

// What was deleted.
struct DeletionResult {
    int events = 0;
    int marks = 0;
    std::int64_t bytes = 0;
};

class Deletion {
  public:
    // host: this machine's, which must hold the lease of a shared mount; of no effect for any other mount. All must
    // outlive this object.
    Deletion(store::Store& store, const store::Mount& mount, const MountFolder& folder, std::int64_t now_s, int host)
        : store_(store),
          mount_(mount),
          folder_(folder),
          events_(store),
          marks_(store),
          mounts_(store),
          now_s_(now_s),
          host_(host) {}

    // The events must be on the mount. Throws store::StoreError; std::system_error for trouble with the mount: what is
    // not deleted by then stays, with its rows. Throws store::LeaseLost once another host maintains a shared mount, which
    // finishes what is pending.
    void Delete(std::span<const store::Event> events);

    // Finishes what is pending deletion: by Delete, or since a crash. Throws as Delete.
    void Finish();

    // Of all calls, also those that threw. What Finish is yet to finish is not in it.
    const DeletionResult& Result() const { return result_; }

  private:
    // On a shared mount, while this host maintains it.
    void Change(const std::function<void()>& change);
    void RemoveFile(const store::Event& event);
    // The rows of removed files, and what else tells of them.
    void Forget(std::span<const store::Event> events);
    bool HasFootage(int camera, std::int64_t begin_s, std::int64_t end_s);
    // Those that ended by then and have no footage left, however many before them have some.
    void RemoveMarks(int camera, std::int64_t end_s);
    void RemoveMark(const store::Mark& mark);
    // False while the mount that holds the span file is not mounted. Here the row is removed after the file: without
    // footage the mark has nothing to show either way.
    bool RemoveSpan(const store::Mark& mark);
    // The recording log says what can be played: seconds that other events share stay.
    void ClearRecordingLog(const store::Event& event);

    store::Store& store_;
    const store::Mount& mount_;
    const MountFolder& folder_;
    store::Events events_;
    store::Marks marks_;
    store::Mounts mounts_;
    const std::int64_t now_s_;
    const int host_;
    DeletionResult result_;
};

}  // namespace lookhaven::maintenance
