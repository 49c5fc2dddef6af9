// SPDX-License-Identifier: Apache-2.0
//
// Recorded events: a row for each file of a camera's recording.
//
// Why so        The file is the record, the row is how it is found. So a row is made after its file exists, and while
//               the file is being removed, the row is pending deletion, where no search finds it: a row that is found
//               never points at nothing. There is no row per frame.
// Invariants    (1) begins before it ends, and at most kMaxRecordingSeconds later: what touches a span of time is found
//                   by looking at a bounded stretch of the index (camera, start), however many events there are.
//               (2) Ids come from one counter with those of marks and are never used twice.
#pragma once

#include <cstdint>
#include <functional>
#include <limits>
#include <map>
#include <optional>
#include <set>
#include <span>
#include <string>
#include <utility>
#include <vector>

#include "standalone/store/cameras.h"
#include "standalone/store/store.h"

namespace lookhaven::store {

// The place in the order of recording that an event has by its id.
constexpr std::int64_t kOrderOfId = std::numeric_limits<std::int64_t>::min();

struct Event {
    int id = 0;
    int camera_id = 0;
    int mount_id = 0;
    std::int64_t start_s = 0;
    std::int64_t end_s = 0;  // of an event that grows, its last second on the mount
    bool recording = false;  // still being written
    int reason = base::kReasonContinuous;
    int frame_count = 0;
    std::int64_t size_bytes = 0;
    base::Codec video_type = base::Codec::kMjpeg;
    std::string audio_codec;  // empty when silent
    int width = 0;
    int height = 0;
    std::string path;   // relative to the mount
    bool kept = false;  // retention leaves it alone (kept_events.h); "archived" in its row and on the wire
    bool demo = false;  // demo data: there is no file
    // Lower is earlier, whatever the clock said. Its id, but for old recordings that got a new id; kOrderOfId until the
    // row is stored.
    std::int64_t order = kOrderOfId;
    int host_id = 0;  // of store/hosts.h, which records or recorded it; 0: a single machine, or not known

    friend bool operator==(const Event&, const Event&) = default;
};

// Which events to read: by default none, since no camera is named.
struct EventFilter {
    std::set<int> camera_ids;
    int mount_id = 0;                                               // 0: any
    std::int64_t begin_s = 0;                                       // events that touch the span from here …
    std::int64_t end_s = std::numeric_limits<std::int64_t>::max();  // … up to, not including, here
    int reason = 0;                                                 // 0: any
    bool finished_only = false;
    bool kept_only = false;
    bool newest_first = false;
    int offset = 0;
    int limit = std::numeric_limits<int>::max();
};

// A step along what can be played, in the order of start and id, which events and marks share. The place it starts from
// need be no event's.
struct Step {
    std::set<int> camera_ids;
    std::int64_t start_s = 0;
    int id = 0;
    bool backwards = false;

    // Whether it comes to one, an event or a mark, before it comes to the other.
    bool IsNearer(const auto& one, const auto& other) const {
        const std::pair first(one.start_s, one.id);
        const std::pair second(other.start_s, other.id);
        return backwards ? first > second : first < second;
    }
};

// Which reasons of recording a step stops at.
enum class Reasons { kAny, kContinuous, kOthers };

// Ids that a host has reserved for its events.
struct EventIdBlock {
    int first_id = 0;
    int ids = 0;
    int host_id = 0;

    bool Has(int id) const { return id >= first_id && id - first_id < ids; }
};

// What a mount holds, without demo events.
struct MountContent {
    std::int64_t events = 0;
    std::int64_t size_bytes = 0;
};

// What there is of a camera, without demo events.
struct CameraFootage {
    std::int64_t events = 0;
    std::int64_t size_bytes = 0;
    std::int64_t oldest_s = 0;  // where the oldest begins
};

// What a camera has on a mount of what was recorded since some moment.
struct RecentFootage {
    int mount_id = 0;
    int camera_id = 0;
    std::int64_t size_bytes = 0;
    std::int64_t first_s = 0;
};

class Events {
  public:
    using Visitor = std::function<void(const Event&)>;

    // The store must outlive this object.
    explicit Events(Store& store) : connection_(store.connection()) {}

    // Reserves the id of a future event; one that is not used is lost.
    int NextId();
    // The first of that many consecutive ids; for the recorder, which must be able to begin events while the store is
    // away.
    int NextIds(int count);
    // The same, and notes them as a block of the host's, which records the events.
    int ReserveIds(int count, int host);
    // The last 4,096 blocks of each host, also of removed hosts.
    std::vector<EventIdBlock> ReservedBlocks();

    // Stores the row under event.id, which came from NextId. Throws InvalidRecord, or AlreadyExists for a used id.
    void Begin(const Event& event);
    // Stores finished rows under new ids, in one transaction. Throws InvalidRecord.
    void AddAll(std::span<const Event> events);
    // end_s: the event's last second on the mount. False when there is no such row; throws InvalidRecord where the
    // event would end before it starts or become too long.
    bool Finish(int id, std::int64_t end_s, int frame_count, std::int64_t size_bytes);
    // What has grown, by id, with end_s, frame_count and size_bytes; in one transaction, since a host has one for each of
    // its cameras each second; no id may occur twice. Returns how many it has changed: an unknown one is left out, and
    // so is one that Finish would refuse. A power cut may lose a Grow that has returned, never a Finish.
    int Grow(std::span<const Event> events);

    // In one transaction; returns the number of rows removed. For rows without a file.
    int Remove(std::span<const int> ids);

    // Removing files with their rows. Until FinishDeletion or CancelDeletion the rows are found by PendingDeletion
    // alone. Each is one transaction. BeginDeletion leaves out growing and kept events, and returns how
    // many there are without them: remove the files of PendingDeletion only.
    int BeginDeletion(std::span<const int> ids);
    void FinishDeletion(std::span<const int> ids);
    void CancelDeletion(std::span<const int> ids);     // the rows are as before
    std::vector<Event> PendingDeletion(int mount_id);  // by id
    // BeginDeletion of all of the camera's events, its demo ones removed at once; in transactions of a thousand rows.
    void BeginDeletionOfCamera(int camera_id);
    // Removes all demo events and marks, in several transactions; returns how many. What a failure leaves the next call
    // removes.
    int RemoveDemo();

    std::optional<Event> Find(int id);
    // By start and id, across all of the filter's cameras.
    std::vector<Event> List(const EventFilter& filter);
    // The same rows without offset and limit, camera by camera, as they come from the store: nothing is collected. The
    // event is borrowed for the call, and the visitor must not use this store.
    void Visit(const EventFilter& filter, const Visitor& visitor);

    // The first behind the place, or the last before it. Takes the time of a few look-ups, whatever lies between.
    std::optional<Event> Next(const Step& step, Reasons reasons);

    // Those still marked as being written; after a crash, what has to be finished. By id.
    std::vector<Event> Open();
    // Finished events of the mount that are neither kept nor demo, in the order in which they were recorded: those
    // after that event, from the first on after Event(). camera_id: those of that camera alone, which takes no longer.
    std::vector<Event> InRecordingOrder(int mount_id, const Event& after, int limit,
                                        std::optional<int> camera_id = std::nullopt);
    // The file's path of an event whose row is pending deletion; nothing when there is no such row.
    std::optional<std::string> PathPendingDeletion(int id);
    // Gives the mount's rows of a recorder of an earlier version, which has no order of recording, that of their ids.
    void SetMissingOrders(int mount_id);
    // The place of a recording whose id says nothing of it: just before what was recorded to the mount after it, as far
    // as dates tell, but not before what precedes it. kOrderOfId when nothing was recorded after it.
    std::int64_t OrderForDate(int mount_id, std::int64_t start_s);
    // Every row of the mount but demo ones, by camera and id. As Visit.
    void VisitMount(int mount_id, const Visitor& visitor);
    // Takes time in proportion to the mount's events: a few tenths of a second for a million.
    MountContent Content(int mount_id);
    // Growing events too, without demo ones, by camera. Reads a row for each event since then, and none before.
    std::vector<RecentFootage> RecordedSince(std::int64_t from_s);
    // What of that many UTC days, the first of which begins then, is left on the mount: bytes a day of finished events
    // that are not kept, as far as the order of recording tells days apart. Reads the index alone.
    std::vector<std::int64_t> BytesByDay(int mount_id, std::int64_t first_day_s, int days);
    // When the event began that was recorded to the mount first; nothing when there is none.
    std::optional<std::int64_t> OldestOn(int mount_id);
    // The cameras, removed ones too, that have events on the mount; mount 0: on any.
    std::set<int> CamerasOn(int mount_id);
    // By camera, those without any left out. camera_id 0: of all, which reads every row: half a second for a million.
    std::map<int, CameraFootage> FootageOfCameras(int camera_id = 0);

  private:
    // The order from which on the mount's events began then or later, between those two.
    std::int64_t OrderSince(int mount_id, std::int64_t start_s, std::int64_t low, std::int64_t high);

    Connection& connection_;
};

}  // namespace lookhaven::store
