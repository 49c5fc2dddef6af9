// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/hosts.h"

#include <limits>

#include "standalone/base/host_name.h"
#include "standalone/store/connection.h"
#include "standalone/store/mounts.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

template <>
struct Mapping<Host> {
    static constexpr const char* kTable = "hosts";
    static constexpr const char* kColumns =
        "id, name, address, port, certificate, version, draining, has_room, processors, heartbeat, holder";
    static auto Members(auto& host) {
        return std::tie(host.id, host.name, host.address, host.port, host.certificate, host.version, host.draining,
                        host.room, host.processors, host.heartbeat, host.recorder);
    }
};

namespace {

constexpr std::size_t kMaxVersionBytes = 64;

void RequireValid(soci::session& sql, const Host& host) {
    RequireFreeName(sql, "hosts", "a host", host.id, host.name);
    if (!base::IsHost(host.address) || host.port < 1 || host.port > 65'535) {
        throw InvalidRecord("a host is reached by a host name or address, and a port from 1 to 65535");
    }
    if (!IsCertificate(host.certificate)) {
        throw InvalidRecord("a host has a certificate in PEM, of up to 32768 bytes");
    }
    if (!IsPlainText(host.version, kMaxVersionBytes)) {
        throw InvalidRecord("a version is at most 64 bytes of UTF-8 without control characters");
    }
}

}  // namespace

int Hosts::Add(const Host& host) {
    return connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Host added = host;
        added.id = NextId(sql, "host");
        RequireValid(sql, added);
        const bool is_first = !Exists(sql, "select id from hosts");
        Execute(sql,
                "insert into hosts (id, name, address, port, certificate, version, draining, has_room, heartbeat,"
                " holder, first_reserved_id)"
                " values (:id, :name, :address, :port, :certificate, :version, :draining, 0, 0, '', :first)",
                added.id, added.name, added.address, added.port, added.certificate, added.version, added.draining,
                std::numeric_limits<int>::max());
        if (is_first) {
            Execute(sql, "update mounts set host_id = :id where host_id = 0", added.id);
            Execute(sql, "update recorder_lease set count = count + 1, holder = ''");
        }
        return added.id;
    });
}

void Hosts::Update(const Host& host) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireValid(sql, host);
        if (Execute(sql,
                    "update hosts set name = :name, address = :address, port = :port, certificate = :certificate,"
                    " version = :version, draining = :draining where id = :id",
                    host.name, host.address, host.port, host.certificate, host.version, host.draining, host.id) == 0) {
            ThrowNotFound("host", host.id);
        }
    });
}

void Hosts::Report(const Host& host) {
    connection_.Execute("update hosts set version = :version, has_room = :room, processors = :processors where id = :id"
                        " and (version <> :old_version or has_room <> :old_room or processors <> :old_processors)",
                        host.version, host.room, host.processors, host.id, host.version, host.room, host.processors);
}

void Hosts::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        if (Exists(sql, "select id from cameras where host_id = :id", id)) {
            throw InvalidRecord("cameras are fixed to this host: give them to another one, or to any, first");
        }
        Execute(sql, "update camera_leases set host_id = 0, count = count + 1 where host_id = :id", id);
        if (Execute(sql, "delete from hosts where id = :id", id) == 0) {
            ThrowNotFound("host", id);
        }
        if (!Exists(sql, "select id from hosts")) {
            // One default alone: its own, else that of the shared ones.
            Execute(sql,
                    "update mounts set is_default = 0 where host_id = :all"
                    " and exists (select 1 from mounts as own where own.host_id = :id)",
                    kAllHosts, id);
            Execute(sql, "update mounts set host_id = 0 where host_id in (:id, :all)", id, kAllHosts);
        }
    });
}

std::optional<Host> Hosts::Find(int id) {
    return connection_.FetchOne<Host>("where id = :id", id);
}

std::optional<Host> Hosts::FindByName(const std::string& name) {
    return connection_.FetchOne<Host>("where name = :name", name);
}

std::vector<Host> Hosts::All() {
    return connection_.FetchAll<Host>("order by id");
}

int Hosts::HostOfCamera(int camera_id) {
    return connection_.FetchOne<int>("select host_id from camera_leases where camera_id = :id", camera_id).value_or(0);
}

}  // namespace lookhaven::store
