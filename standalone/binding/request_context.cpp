// SPDX-License-Identifier: Apache-2.0
#include "standalone/binding/request_context.h"

#include <algorithm>
#include <stdexcept>
#include <string>
#include <string_view>

#include <malloc.h>
#include <sys/stat.h>

#include "platform/log/dbglogcfg.h"
#include "standalone/base/log.h"
#include "standalone/control/debug_log_config.h"
#include "standalone/store/camera_leases.h"
#include "standalone/store/cameras.h"

DbgLogCfg* g_pDbgLogCfg = nullptr;
int g_DbgLogPid = 0;

namespace lookhaven::binding {

static_assert(sizeof(DbgLogCfg) == sizeof(control::DebugLogConfig));
static_assert(offsetof(DbgLogCfg, m_CategLevel) == offsetof(control::DebugLogConfig, category_level));
static_assert(offsetof(DbgLogCfg, m_PidCount) == offsetof(control::DebugLogConfig, process_count));
static_assert(offsetof(DbgLogCfg, m_PidLevel) == offsetof(control::DebugLogConfig, process));

namespace {

StoreIdentity IdentityOf(const std::string& url) {
    constexpr std::string_view kSqlite = "sqlite:";
    struct stat file {};
    if (url.starts_with(kSqlite) && ::stat(url.c_str() + kSqlite.size(), &file) == 0) {
        return {url, file.st_dev, file.st_ino};
    }
    return {url};
}

}  // namespace

RequestContext& RequestContext::Current() {
    // Never destroyed: a request process leaves by _exit, and what is here goes with it.
    static RequestContext& context = *new RequestContext;
    return context;
}

void RequestContext::OpenRecordsAhead(const base::Installation& installation) {
    StoreIdentity identity = IdentityOf(installation.StoreUrl());
    auto records = std::make_unique<store::Store>(store::Store::Open(identity.url));
    // Records that do not exist: reading them warms up this process's memory.
    store::Users(*records).Find(0);
    store::Cameras(*records).Find(0);
    records_ = std::move(records);
    opened_ahead_ = std::move(identity);
}

void RequestContext::Begin(const base::Installation& installation, Output* output, RequestEvents events) {
    base::SetLogProgram("request");
    installation_ = installation;
    output_ = output;
    events_ = std::move(events);
    g_DbgLogPid = 0;
    // The module only reads it, through a declaration that knows no const.
    const void* config = control::MapDebugLog(installation);
    g_pDbgLogCfg = static_cast<DbgLogCfg*>(const_cast<void*>(config));
}

const base::Installation& RequestContext::Installation() const {
    if (!installation_) {
        throw std::logic_error("this process serves no request");
    }
    return *installation_;
}

store::Store& RequestContext::Records() {
    if (opened_ahead_) {
        const bool is_same = opened_ahead_ == IdentityOf(Installation().StoreUrl());
        if (!is_same || !records_->IsUpToDate()) {
            records_.reset();
        }
        opened_ahead_.reset();
    }
    if (records_ == nullptr) {
        records_ = std::make_unique<store::Store>(store::Store::Open(Installation().StoreUrl()));
    }
    return *records_;
}

const std::vector<store::Mount>& RequestContext::Mounts() {
    if (!cache_.mounts) {
        cache_.mounts = store::Mounts(Records()).List();
    }
    return *cache_.mounts;
}

const std::map<int, store::RecordingPlan>& RequestContext::Plans() {
    if (!cache_.plans) {
        cache_.plans = store::RecordingPlans(Records()).List();
    }
    return *cache_.plans;
}

int RequestContext::HostOf(int camera_id) {
    if (!cache_.hosts) {
        cache_.hosts.emplace();
        // A machine that is no host is asked for none.
        for (const store::CameraLease& lease :
             Installation().HostId() == 0 ? std::vector<store::CameraLease>() : store::CameraLeases(Records()).List()) {
            (*cache_.hosts)[lease.camera_id] = lease.host_id != 0 ? lease.host_id : lease.fixed_host_id;
        }
    }
    const auto host = cache_.hosts->find(camera_id);
    return host == cache_.hosts->end() ? 0 : host->second;
}

// As store::Mounts::FindForPlan.
const store::Mount* RequestContext::MountOf(int camera_id) {
    const auto plan = Plans().find(camera_id);
    const int planned = plan == Plans().end() ? 0 : plan->second.mount_id;
    const int host = HostOf(camera_id);
    const store::Mount* found = nullptr;
    for (const store::Mount& mount : Mounts()) {
        const bool may_have = host == 0 || mount.IsOf(host);
        if (mount.id == planned && may_have) {
            return &mount;
        }
        // Its own comes before one that all hosts share.
        if (mount.is_default && may_have && (found == nullptr || found->IsShared())) {
            found = &mount;
        }
    }
    return planned != 0 && host == 0 ? nullptr : found;
}

void RequestContext::CloseRecords() {
    cache_ = {};
    opened_ahead_.reset();
    if (records_ != nullptr) {
        records_.reset();
        // What the store worked with is half of a viewer's own memory, and there may be hundreds of viewers.
        ::malloc_trim(0);
    }
}

void RequestContext::NoteStream() {
    if (!is_stream_) {
        is_stream_ = true;
        events_.on_stream();
    }
}

void LogFailure(const char* name, const std::exception& error) {
    base::LogError(std::string(name) + ": " + error.what());
    using Failure = RequestContext::StoreFailure;
    if (dynamic_cast<const store::StoreUnavailable*>(&error) != nullptr) {
        RequestContext::Current().NoteStoreFailure(Failure::kUnavailable);
    } else if (dynamic_cast<const store::StoreError*>(&error) != nullptr) {
        RequestContext::Current().NoteStoreFailure(Failure::kFailed);
    }
}

}  // namespace lookhaven::binding
