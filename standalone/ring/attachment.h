// SPDX-License-Identifier: Apache-2.0
//
// Attaches segments of this user to the process, and lists them.
//
// Why so        Any local user may make a segment under the key of a ring. Such a segment is never attached, adopted or
//               removed: a segment of ours was made and is owned by our user, and nobody else may access it.
#pragma once

#include <functional>
#include <utility>

#include <sys/shm.h>
#include <sys/types.h>
#include <unistd.h>

#include "standalone/ring/segment.h"

namespace lookhaven::ring {

constexpr int kSegmentMode = 0600;

// The user made the segment and owns it, and no other has access.
bool IsOwn(const shmid_ds& status, uid_t user = ::geteuid());

// One attachment of a segment to this process.
class Attachment {
  public:
    Attachment() = default;
    // Attaches the segment. Throws std::system_error, with EACCES when the segment is not the user's own.
    explicit Attachment(int shm_id, uid_t user = ::geteuid());
    Attachment(Attachment&& other) noexcept
        : shm_id_(std::exchange(other.shm_id_, -1)),
          address_(std::exchange(other.address_, nullptr)) {}
    Attachment& operator=(Attachment&& other) noexcept;
    ~Attachment();

    void* Address() const { return address_; }
    int ShmId() const { return shm_id_; }
    explicit operator bool() const { return address_ != nullptr; }
    // Hands the attachment to the caller, who detaches it.
    void* Release();
    // Removes the segment's key: nobody finds it any more, and it vanishes with its last attachment.
    void RemoveSegment() const;
    // Copies what this process has just written to a new segment's head.
    void CopyConstants() const;

  private:
    int shm_id_ = -1;
    void* address_ = nullptr;
};

// Ends the attachment at the address. After a bare shmdt one page of this process stays mapped in front of it.
void DetachSegment(void* address);

// Calls back for each of the user's segments, as it was before anything is attached.
void ForEachOwnSegment(const std::function<void(int shm_id, const shmid_ds&)>& call, uid_t user = ::geteuid());

}  // namespace lookhaven::ring
