// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/servers.h"

#include "standalone/base/host_name.h"
#include "standalone/base/text.h"
#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

template <>
struct Mapping<RecordingServer> {
    static constexpr const char* kTable = "servers";
    static constexpr const char* kColumns = "id, name, address, port, certificate, enabled";
    static auto Members(auto& server) {
        return std::tie(server.id, server.name, server.address, server.port, server.certificate, server.enabled);
    }
};

using ServerRow = std::pair<RecordingServer, std::string>;

template <>
struct Mapping<ServerRow> {
    static constexpr const char* kTable = "servers";
    static constexpr const char* kColumns = "id, name, address, port, certificate, enabled, secret";
};

template <>
struct Mapping<RemoteCamera> {
    static constexpr const char* kTable = "remote_cameras";
    static constexpr const char* kColumns = "id, server_id, id_on_server, name, video_type, audio";
    static auto Members(auto& camera) {
        return std::tie(camera.id, camera.server_id, camera.id_on_server, camera.name, camera.video_type, camera.audio);
    }
};

template <>
struct Mapping<ServerDenial> {
    static auto Members(auto& denial) { return std::tie(denial.user, denial.kind, denial.id); }
};

namespace {

constexpr std::size_t kMaxCameraNameBytes = 255;
constexpr std::size_t kSecretDigits = 64;

void RequireValid(soci::session& sql, const RecordingServer& server) {
    if (server.address.empty() ? server.port != 0
                               : !base::IsHost(server.address) || server.port < 1 || server.port > 65'535) {
        throw InvalidRecord("a paired host is reached by a host name or address, and a port from 1 to 65535");
    }
    if (server.address.empty() != server.certificate.empty() ||
        (!server.certificate.empty() && !IsCertificate(server.certificate))) {
        throw InvalidRecord("a paired host that has an address has a certificate in PEM, of up to 32768 bytes");
    }
    RequireFreeName(sql, "servers", "a paired host", server.id, server.name);
}

void RequireSecret(const std::string& secret) {
    if (!base::IsHex(secret, kSecretDigits)) {
        throw InvalidRecord("the secret of two hosts is 64 hexadecimal digits");
    }
}

// Also locks the row against a concurrent removal, where there are row locks.
void RequireServer(soci::session& sql, int id) {
    Require(FetchOne<int>(sql, "update servers set name = name where id = :id returning id", id), "paired host", id);
}

constexpr const char* kWithId = "where id = :id";
constexpr const char* kOnServer = "where server_id = :server and id_on_server = :there";

void RequireValid(const RemoteCamera& camera) {
    if (camera.name.empty() || !IsPlainText(camera.name, kMaxCameraNameBytes)) {
        throw InvalidRecord("a camera's name is 1 to 255 bytes of UTF-8 without control characters");
    }
    if (camera.id_on_server < 1) {
        throw InvalidRecord("a camera's id on its host is a number from 1");
    }
    if (!base::IsVideo(camera.video_type)) {
        throw InvalidRecord("a camera sends MJPEG, H.264 or H.265");
    }
}

struct PutCounts {
    int added = 0;
    int changed = 0;
};

// Returns the camera's id here.
int PutRow(soci::session& sql, RemoteCamera camera, PutCounts& counts) {
    const auto known = FetchOne<RemoteCamera>(sql, kOnServer, camera.server_id, camera.id_on_server);
    camera.id = known ? known->id : NextId(sql, "camera");
    if (!known) {
        Insert(sql, camera);
        ++counts.added;
    } else if (known != camera) {
        store::Update(sql, camera);
        ++counts.changed;
    }
    return camera.id;
}

PutCounts PutRows(soci::session& sql, int server_id, const std::vector<RemoteCamera>& cameras) {
    PutCounts counts;
    for (RemoteCamera camera : cameras) {
        RequireValid(camera);
        camera.server_id = server_id;
        PutRow(sql, camera, counts);
    }
    if (FetchOne<int>(sql, "select count(*) from remote_cameras where server_id = :id", server_id) >
        static_cast<int>(kMaxServerCameras)) {
        throw InvalidRecord("a paired host has 1000 cameras at most");
    }
    return counts;
}

int AddRow(soci::session& sql, RecordingServer server, const std::string& secret) {
    server.id = NextId(sql, "server");
    RequireValid(sql, server);
    Insert(sql, ServerRow(server, secret));
    return server.id;
}

// The host with the id of the record that it replaces; 0 where there is none.
RecordingServer Matched(soci::session& sql, RecordingServer server) {
    const auto known = FetchOne<RecordingServer>(sql, "where name = :name", server.name);
    server.id = known && known->address.empty() == server.address.empty() ? known->id : 0;
    return server;
}

void UpdateRow(soci::session& sql, const RecordingServer& server, const std::optional<std::string>& secret) {
    RequireServer(sql, server.id);
    RequireValid(sql, server);
    store::Update(sql, server);
    if (secret) {
        Execute(sql, "update servers set secret = :secret where id = :id", *secret, server.id);
    }
}

}  // namespace

std::uint64_t PairingId(const std::string& secret) {
    return std::max<std::uint64_t>(std::hash<std::string>()(secret), 1);
}

int RecordingServers::Add(const RecordingServer& server, const std::string& secret) {
    RequireSecret(secret);
    return connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        return AddRow(sql, server, secret);
    });
}

int RecordingServers::Pair(const RecordingServer& server, const std::string& secret,
                           const std::vector<RemoteCamera>& cameras) {
    RequireSecret(secret);
    return connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RecordingServer paired = Matched(sql, server);
        if (paired.id != 0) {
            UpdateRow(sql, paired, secret);
        } else {
            paired.id = AddRow(sql, server, secret);
        }
        PutRows(sql, paired.id, cameras);
        return paired.id;
    });
}

void RecordingServers::RequirePairable(const RecordingServer& server) {
    connection_.Write([&](soci::session& sql) { RequireValid(sql, Matched(sql, server)); });
}

void RecordingServers::Update(const RecordingServer& server, const std::optional<std::string>& secret) {
    if (secret) {
        RequireSecret(*secret);
    }
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        UpdateRow(sql, server, secret);
    });
}

void RecordingServers::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireServer(sql, id);
        for (const char* table : {"camera_ports", "denied_cameras"}) {
            Execute(sql,
                    std::string("delete from ") + table +
                        " where camera_id in (select id from remote_cameras where server_id = :id)",
                    id);
        }
        Execute(sql,
                "delete from denied_items where exists (select 1 from devices"
                " where devices.kind = denied_items.kind and devices.id = item_id and server_id = :id)",
                id);
        Execute(sql, "delete from devices where server_id = :id", id);
        Execute(sql, "delete from servers where id = :id", id);
    });
}

std::vector<ServerDenial> RecordingServers::Denials(int id) {
    return connection_.FetchAll<ServerDenial>(
        "select users.name, 0, camera_id from denied_cameras join users on users.id = user_id"
        " join remote_cameras on remote_cameras.id = camera_id where server_id = :cameras_of"
        " union select users.name, denied_items.kind, item_id from denied_items join users on users.id = user_id"
        " join devices on devices.kind = denied_items.kind and devices.id = item_id where server_id = :devices_of"
        " order by 1, 2, 3",
        id, id);
}

std::optional<RecordingServer> RecordingServers::Find(int id) {
    return connection_.FetchOne<RecordingServer>(kWithId, id);
}

std::vector<RecordingServer> RecordingServers::List() {
    return connection_.FetchAll<RecordingServer>("order by id");
}

std::string RecordingServers::FindSecret(int id) {
    return connection_.FetchOne<std::string>("select secret from servers where id = :id and enabled = 1", id)
        .value_or("");
}

std::vector<std::string> RecordingServers::InboundPeerSecrets() {
    return connection_.FetchAll<std::string>("select secret from servers where enabled = 1 and address = ''"
                                             " order by id");
}

std::set<std::uint64_t> RecordingServers::Pairings() {
    std::set<std::uint64_t> pairings;
    for (const std::string& secret :
         connection_.FetchAll<std::string>("select secret from servers where enabled = 1")) {
        pairings.insert(PairingId(secret));
    }
    return pairings;
}

int RecordingServers::PutCamera(const RemoteCamera& camera) {
    RequireValid(camera);
    return connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        RequireServer(sql, camera.server_id);
        PutCounts ignored;
        return PutRow(sql, camera, ignored);
    });
}

int RecordingServers::PutCameras(int server_id, const std::vector<RemoteCamera>& cameras) {
    return connection_.Write([&](soci::session& sql) {
        RequireServer(sql, server_id);
        const PutCounts counts = PutRows(sql, server_id, cameras);
        if (counts.added + counts.changed > 0) {
            RaiseRevision(sql);
        }
        return counts.added;
    });
}

void RecordingServers::RemoveCamera(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Require(FetchOne<RemoteCamera>(sql, kWithId, id), "remote camera", id);
        Execute(sql, "delete from camera_ports where camera_id = :id", id);
        Execute(sql, "delete from remote_cameras where id = :id", id);
    });
}

std::optional<RemoteCamera> RecordingServers::FindCamera(int id) {
    return connection_.FetchOne<RemoteCamera>(kWithId, id);
}

std::optional<RemoteCamera> RecordingServers::FindCamera(int server_id, int id_on_server) {
    return connection_.FetchOne<RemoteCamera>(kOnServer, server_id, id_on_server);
}

std::vector<RemoteCamera> RecordingServers::ListCameras() {
    return connection_.FetchAll<RemoteCamera>("order by id");
}

std::vector<RemoteCamera> RecordingServers::ListCameras(int server_id) {
    return connection_.FetchAll<RemoteCamera>("where server_id = :id order by id", server_id);
}

}  // namespace lookhaven::store
