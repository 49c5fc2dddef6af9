// SPDX-License-Identifier: Apache-2.0
//
// The one request that this process serves: its caller, what the caller was granted, its store and its output.
//
// Why so        The module asks for a ring or a camera without saying on whose behalf, so who the caller is must be
//               known to the whole process. A request process serves one request, hence one context.
// Thread safety One thread.
#pragma once

#include <algorithm>
#include <cstdint>
#include <functional>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <vector>

#include <sys/types.h>

#include "platform/export.h"
#include "standalone/base/installation.h"
#include "standalone/binding/output.h"
#include "standalone/binding/send_queue.h"
#include "standalone/control/demand.h"
#include "standalone/ring/stream.h"
#include "standalone/store/mounts.h"
#include "standalone/store/recording_plans.h"
#include "standalone/store/store.h"
#include "standalone/store/users.h"

namespace lookhaven::binding {

// Called while the module works.
struct RequestEvents {
    // Once, when it turns out that the answer is a stream: it has no deadline.
    std::function<void()> on_stream = [] {};
    // The process plays recordings, reachable under the client's stream key; its player file is written.
    std::function<void(std::int64_t key)> on_player = [](std::int64_t) {};
    // The caller has proved to be a paired host. May throw, which ends the request.
    std::function<void(const std::string& secret)> on_paired_host = [](const std::string&) {};
};

// The rights that a request's "privData" leaves to its caller.
struct Restrictions {
    std::set<int> cameras;                                  // denied, for every kind of access
    std::set<int> sound;                                    // of these the sound alone
    store::Privilege privilege = store::Privilege::kOwner;  // and no more

    bool IsDenied(int camera, store::CameraAccess kind) const {
        return cameras.contains(camera) || (kind == store::CameraAccess::kAudio && sound.contains(camera));
    }
    // Adds what they deny of that kind.
    void AddTo(std::set<int>& denied, store::CameraAccess kind) const;
};

// A picture of a recording, in the caller's buffer.
struct RecordedPicture {
    const void* data = nullptr;
    std::int64_t captured_ms = 0;  // wall clock
};

// What the store told about the caller and the mounts. A search asks for the same once for each of its cameras.
struct RecordCache {
    std::optional<std::optional<store::User>> caller;
    std::map<store::CameraAccess, std::set<int>> denied_cameras;  // to the caller
    std::optional<std::vector<store::Mount>> mounts;
    std::optional<std::map<int, store::RecordingPlan>> plans;
    std::optional<std::map<int, int>> hosts;  // of the store, by the camera that each records
};

// Tells one store from another: a file can be replaced by one of the same name, as by restoring a backup.
struct StoreIdentity {
    std::string url;
    dev_t device = 0;  // these two are 0 for a server, and for a file that is not there
    ino_t inode = 0;

    bool operator==(const StoreIdentity&) const = default;
};

class LH_PLATFORM_API RequestContext {
  public:
    // The context of this process. Belongs to no installation until Begin.
    static RequestContext& Current();

    RequestContext() = default;
    RequestContext(const RequestContext&) = delete;
    RequestContext& operator=(const RequestContext&) = delete;

    // In a process that waits for its request: opens the store, and reads it once as requests do, so that their first
    // read is fast. Records opens it anew when it is out of date by then: the installation has another store, the store
    // another schema, or its server is lost, takes no changes or does not answer within two seconds. Throws
    // store::StoreError.
    void OpenRecordsAhead(const base::Installation& installation);

    // Borrows output for the rest of the process's life, null where nothing is sent.
    void Begin(const base::Installation& installation, Output* output, RequestEvents events = {});

    // Throws std::logic_error before Begin.
    const base::Installation& Installation() const;
    Output* output() const { return output_; }
    // What of the output is still on its way to the viewer; null when nobody knows. Borrowed like the output.
    SendQueue* Queue() const { return queue_; }
    void SetQueue(SendQueue* queue) { queue_ = queue; }

    // The record store, opened by the first call, or checked by it where OpenRecordsAhead has opened it. Throws
    // store::StoreError.
    store::Store& Records();
    // What this request has read; empty after CloseRecords and for another caller.
    RecordCache& Cache() { return cache_; }
    const std::vector<store::Mount>& Mounts();
    const std::map<int, store::RecordingPlan>& Plans();
    // The host of the store that records the camera, or is to; 0 where there are none, and while nobody does.
    int HostOf(int camera_id);
    // The mount that the camera is recorded to: its plan's, or the default one. Null when there is none.
    const store::Mount* MountOf(int camera_id);
    // Closes the store, which the next Records reopens: a stream that runs for weeks must not hold it open. Call it
    // before sending or waiting; references from Records are invalid afterwards.
    void CloseRecords();

    // The caller: a user's id, PAIR_AUTH_UID for a paired host, 0 for nobody.
    unsigned int Caller() const { return caller_; }
    void SetCaller(unsigned int user_id) {
        caller_ = user_id;
        cache_ = {};
    }
    // The handle of the caller's session; empty when there is none.
    const std::string& Session() const { return session_; }
    void SetSession(const std::string& handle) { session_ = handle; }
    // What the request itself takes away from the caller's rights.
    const Restrictions& RequestRestrictions() const { return restrictions_; }
    void Restrict(Restrictions restrictions) { restrictions_ = std::move(restrictions); }

    // The live stream that the caller has been granted, and whether with its sound.
    const std::optional<control::LiveStream>& GrantedStream() const { return granted_; }
    bool MayHear() const { return may_hear_; }
    void GrantStream(control::LiveStream stream, bool may_hear) {
        granted_ = stream;
        may_hear_ = may_hear;
    }

    // The answer is a stream, which may run for as long as the client likes.
    void NoteStream();
    void NotePlayer(std::int64_t key) { events_.on_player(key); }
    void NotePairedHost(const std::string& secret) { events_.on_paired_host(secret); }
    // The answer is a picture, alone or in a stream.
    void NotePicture() { wants_picture_ = true; }
    bool WantsPicture() const { return !is_hidden_ && (wants_picture_ || is_stream_); }
    // The camera is denied to the caller, who must not be able to tell it from one that does not exist.
    void NoteHidden() { is_hidden_ = true; }

    // The store has failed, so what the module takes for an empty list or a missing record is none.
    enum class StoreFailure { kNone, kUnavailable, kFailed };
    void NoteStoreFailure(StoreFailure failure) { store_failure_ = std::max(store_failure_, failure); }
    StoreFailure WorstStoreFailure() const { return store_failure_; }

    // The ring entry that was read last and not given back; null when there is none.
    const ring::Entry* HeldEntry() const { return held_entry_; }
    void SetHeldEntry(const ring::Entry* entry) { held_entry_ = entry; }

    // The recorded picture that was read last, as long as its recording is open; no data when there is none.
    const RecordedPicture& LastRecorded() const { return last_recorded_; }
    void SetLastRecorded(RecordedPicture picture) { last_recorded_ = picture; }

  private:
    std::optional<base::Installation> installation_;
    Output* output_ = nullptr;
    SendQueue* queue_ = nullptr;
    RequestEvents events_;
    std::unique_ptr<store::Store> records_;
    std::optional<StoreIdentity> opened_ahead_;  // the store of records_, until that is known to be up to date
    RecordCache cache_;
    unsigned int caller_ = 0;
    std::string session_;
    Restrictions restrictions_;
    std::optional<control::LiveStream> granted_;
    bool may_hear_ = false;
    bool is_stream_ = false;
    bool wants_picture_ = false;
    bool is_hidden_ = false;
    StoreFailure store_failure_ = StoreFailure::kNone;
    const ring::Entry* held_entry_ = nullptr;
    RecordedPicture last_recorded_;
};

// Writes "name: what" to the log, and notes a failure of the store.
void LogFailure(const char* name, const std::exception& error);

// The result of ask, or failure when it throws; the exception is logged under the name. For calls that can tell the
// module nothing but success or failure. Where it was the store that failed, the request fails, whatever the module
// answers.
template <typename Result, typename Ask>
Result OrFailure(const char* name, Result failure, Ask&& ask) {
    try {
        return ask();
    } catch (const std::exception& error) {
        LogFailure(name, error);
        return failure;
    }
}

}  // namespace lookhaven::binding
