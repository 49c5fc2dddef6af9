// SPDX-License-Identifier: Apache-2.0
#include "standalone/ring/attachment.h"

#include <cerrno>
#include <cstring>

#include <sys/ipc.h>
#include <sys/mman.h>
#include <unistd.h>

#include "standalone/base/file.h"

namespace lookhaven::ring {

namespace {

// What lies in front of a segment: as much as its address must be aligned to.
std::size_t LeadBytes() {
    return static_cast<std::size_t>(SHMLBA);
}

// What a segment takes: the kernel rounds to pages, which may be smaller than the lead.
std::size_t WholePages(std::size_t bytes) {
    const auto page = static_cast<std::size_t>(::sysconf(_SC_PAGESIZE));
    return (bytes + page - 1) / page * page;
}

// Address space for a segment with writable memory of this process in front of it. Returns the segment's address.
unsigned char* ReserveSpace(std::size_t segment_bytes) {
    const std::size_t lead = LeadBytes();
    const std::size_t segment = WholePages(segment_bytes);
    const std::size_t total = segment + 2 * lead;
    void* space = ::mmap(nullptr, total, PROT_NONE, MAP_PRIVATE | MAP_ANONYMOUS | MAP_NORESERVE, -1, 0);
    if (space == MAP_FAILED) {
        base::ThrowErrno("cannot attach shared memory");
    }
    auto* begin = static_cast<unsigned char*>(space);
    unsigned char* address = begin + 2 * lead - reinterpret_cast<std::uintptr_t>(begin) % lead;
    if (const auto unused = static_cast<std::size_t>(address - lead - begin); unused > 0) {
        ::munmap(begin, unused);
    }
    if (const auto unused = static_cast<std::size_t>(begin + total - (address + segment)); unused > 0) {
        ::munmap(address + segment, unused);
    }
    if (::mprotect(address - lead, lead, PROT_READ | PROT_WRITE) != 0) {
        const int error = errno;
        ::munmap(address - lead, lead + segment);
        errno = error;
        base::ThrowErrno("cannot attach shared memory");
    }
    return address;
}

LocalHead& LocalHeadAt(void* address) {
    return *reinterpret_cast<LocalHead*>(static_cast<unsigned char*>(address) - sizeof(LocalHead));
}

}  // namespace

bool IsOwn(const shmid_ds& status, uid_t user) {
    return status.shm_perm.uid == user && status.shm_perm.cuid == user && (status.shm_perm.mode & 0777) == kSegmentMode;
}

Attachment::Attachment(int shm_id, uid_t user) : shm_id_(shm_id) {
    shmid_ds status{};
    if (::shmctl(shm_id, IPC_STAT, &status) != 0) {
        base::ThrowErrno("cannot examine shared memory");
    }
    if (!IsOwn(status, user)) {
        errno = EACCES;
        base::ThrowErrno("the shared memory is another user's");
    }
    unsigned char* address = ReserveSpace(status.shm_segsz);
    if (::shmat(shm_id, address, SHM_REMAP) == reinterpret_cast<void*>(-1)) {
        const int error = errno;
        ::munmap(address - LeadBytes(), LeadBytes() + WholePages(status.shm_segsz));
        errno = error;
        base::ThrowErrno("cannot attach shared memory");
    }
    address_ = address;
    LocalHeadAt(address_).real_bytes = status.shm_segsz;
    CopyConstants();
}

Attachment& Attachment::operator=(Attachment&& other) noexcept {
    std::swap(shm_id_, other.shm_id_);
    std::swap(address_, other.address_);
    return *this;
}

Attachment::~Attachment() {
    if (address_ != nullptr) {
        DetachSegment(address_);
    }
}

void* Attachment::Release() {
    return std::exchange(address_, nullptr);
}

void Attachment::RemoveSegment() const {
    ::shmctl(shm_id_, IPC_RMID, nullptr);
}

void Attachment::CopyConstants() const {
    LocalHead& local = LocalHeadAt(address_);
    if (local.real_bytes < sizeof(SegmentHead)) {
        return;
    }
    const SegmentHead& head = View(address_).Head();
    local.magic = head.magic.load();
    if (local.magic == kMagic) {
        std::memcpy(&local.constants, &head.constants, sizeof local.constants);
    }
}

void DetachSegment(void* address) {
    ::shmdt(address);
    ::munmap(static_cast<unsigned char*>(address) - LeadBytes(), LeadBytes());
}

void ForEachOwnSegment(const std::function<void(int shm_id, const shmid_ds&)>& call, uid_t user) {
    // Unlike SHM_INFO this counts no pages.
    shminfo limits{};
    const int last = ::shmctl(0, IPC_INFO, reinterpret_cast<shmid_ds*>(&limits));
    for (int i = 0; i <= last; ++i) {
        shmid_ds status{};
        const int shm_id = ::shmctl(i, SHM_STAT, &status);
        if (shm_id >= 0 && IsOwn(status, user)) {
            call(shm_id, status);
        }
    }
}

}  // namespace lookhaven::ring
