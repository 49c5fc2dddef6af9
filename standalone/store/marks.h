// SPDX-License-Identifier: Apache-2.0
//
// Marks: alerts reported by a device, transactions reported by a POS terminal. Their footage is a span of a camera's
// recordings.
//
// Why so        Reporting must not wait for the footage, which is complete only after the post-record time.
//               So a mark is stored at once as pending, and the recorder, which owns the mounts, writes the span file.
#pragma once

#include <cstdint>
#include <limits>
#include <optional>
#include <set>
#include <stdexcept>
#include <string>
#include <vector>

#include "standalone/store/events.h"
#include "standalone/store/store.h"
#include "standalone/store/text_query.h"

namespace lookhaven::store {

// The numbers are stored, and are those of a client's event types.
enum class MarkKind : int { kAlert = 1, kPos = 2 };

enum class MarkState : int {
    kPending = 0,  // the recorder has not seen the end of its span yet
    kSaved = 1,    // the span file is on the mount
    kMissed = 2,   // nothing of the span was recorded
};
// "pending", "saved" or "missed".
const char* NameOf(MarkState state);

constexpr std::int64_t kMaxMarkSeconds = 3600;
constexpr std::size_t kMaxMarkTextBytes = 8192;
constexpr int kMarksPerDay = 5000;  // of an account, unless the setting marks_per_day says otherwise

// Whose word a mark is: an account of the web API, an access token, whose number is negative, or the command line,
// which has none.
struct Reporter {
    int user_id = 0;
    std::string name;

    friend bool operator==(const Reporter&, const Reporter&) = default;
};

struct Mark {
    int id = 0;
    MarkKind kind = MarkKind::kAlert;
    int camera_id = 0;
    std::int64_t moment_s = 0;  // when it happened
    std::int64_t start_s = 0;   // the footage: with the camera's time before …
    std::int64_t end_s = 0;     // … and after
    std::string text;           // lines separated by "\n": the receipt, or the alert's text
    MarkState state = MarkState::kPending;
    int mount_id = 0;  // these two once it is saved
    std::string path;  // of the span file, relative to the mount
    bool demo = false;
    Reporter reporter;            // named as the account was called then
    std::int64_t reported_s = 0;  // 0: not known

    friend bool operator==(const Mark&, const Mark&) = default;
};

// Which marks to read: by default none, since no camera is named.
struct MarkFilter {
    std::set<int> camera_ids;
    std::optional<MarkKind> kind = std::nullopt;
    TextQuery words;           // in their texts
    std::int64_t begin_s = 0;  // marks whose footage touches the span from here …
    std::int64_t end_s = std::numeric_limits<std::int64_t>::max();  // … up to, not including, here
    bool newest_first = false;
    int offset = 0;
    int limit = std::numeric_limits<int>::max();
};

class TooManyMarks : public std::runtime_error {
  public:
    TooManyMarks()
        : std::runtime_error(
              "this account or access token has reported as many events as it may within 24 hours, or as may wait for "
              "their footage") {}
};

class Marks {
  public:
    // The store must outlive this object.
    explicit Marks(Store& store) : connection_(store.connection()) {}

    // Stores a pending mark and returns it with its id and with the span that the camera's recording plan asks for.
    // length_s: 0 … kMaxMarkSeconds, how long what happened took. text: UTF-8, at most kMaxMarkTextBytes, no control
    // characters but line ends. now_s: when it was reported. max_per_day: as many as that, of those that there are, may
    // an account have reported within 24 hours, or earlier and still pending, however many report at once. Throws
    // InvalidRecord, NotFound for an unknown camera, TooManyMarks.
    Mark Add(MarkKind kind, int camera_id, std::int64_t moment_s, std::int64_t length_s, const std::string& text,
             const Reporter& reporter = {}, std::int64_t now_s = 0,
             std::int64_t max_per_day = std::numeric_limits<std::int64_t>::max());
    // Stores rows as they are but under new ids, in one transaction. Throws InvalidRecord.
    void AddAll(const std::vector<Mark>& marks);

    // These are false when there is no such mark, or for Miss none in that state. Save throws InvalidRecord for a path
    // that is no text.
    bool Save(int id, int mount_id, const std::string& path);
    bool Miss(int id, MarkState state = MarkState::kPending);
    bool Remove(int id);

    std::optional<Mark> Find(MarkKind kind, int id);
    // By start and id.
    std::vector<Mark> List(const MarkFilter& filter);
    // As Events::Next, among saved marks; of one kind, or of both.
    std::optional<Mark> Next(const Step& step, std::optional<MarkKind> kind);
    // In the order of being reported, which is that of their ids: the transaction that takes an id locks the counter
    // until its commit, so none becomes visible after a larger one. Without demo marks.
    std::vector<Mark> ReportedAfter(int id, int limit);
    struct Report {
        int id = 0;
        int camera_id = 0;
        std::int64_t reported_s = 0;
    };
    // Those between the two ids, the newest first. Without demo marks.
    std::vector<Report> ReportsBetween(int after, int before, int limit);
    // The largest id of a mark; 0 for none. Costs next to nothing.
    int NewestId();
    // What the recorder has to save, by the end of the span. Costs nothing when there is none.
    std::vector<Mark> Pending();
    // Marks of the camera whose footage ended at or before that time, by start and id, without demo and pending ones:
    // what retention removes once it has removed the footage. Those after that mark; from the first for an empty one.
    std::vector<Mark> EndedBy(int camera_id, std::int64_t time_s, const Mark& after, int limit);
    // Every saved mark of the mount but demo ones, by id.
    std::vector<Mark> OnMount(int mount_id);

  private:
    Connection& connection_;
};

// The recordings that the mark's footage lies in, growing ones too.
std::vector<Event> RecordingsOf(Store& store, const Mark& mark);

}  // namespace lookhaven::store
