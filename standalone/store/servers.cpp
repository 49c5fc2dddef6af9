// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/servers.h"

#include <limits>

#include "standalone/store/connection.h"
#include "standalone/store/text.h"

namespace lookhaven::store {

namespace {

constexpr std::size_t kMaxNameBytes = 64;
constexpr std::size_t kMaxCameraNameBytes = 255;
constexpr std::size_t kMaxAddressBytes = 253;
constexpr std::size_t kMaxCertificateBytes = 16'384;
constexpr std::size_t kSecretDigits = 64;

std::vector<RecordingServer> Fetch(soci::session& sql, int first, int last) {
    RecordingServer server;
    int enabled = 0;
    soci::statement rows =
        (sql.prepare << "select id, name, address, port, certificate, enabled from servers"
                        " where id >= :first and id <= :last order by id",
         soci::use(first, "first"), soci::use(last, "last"), soci::into(server.id), soci::into(server.name),
         soci::into(server.address), soci::into(server.port), soci::into(server.certificate), soci::into(enabled));
    rows.execute();
    std::vector<RecordingServer> servers;
    while (rows.fetch()) {
        server.enabled = enabled != 0;
        servers.push_back(server);
    }
    return servers;
}

// Letters, digits, ".", "-" and, of IPv6, ":": the address becomes a part of the web server's configuration.
bool IsAddress(std::string_view address) {
    return !address.empty() && address.size() <= kMaxAddressBytes &&
           address.find_first_not_of("ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz0123456789.-:") ==
               std::string_view::npos &&
           address.front() != '-';
}

// The base64 lines between the usual head and foot, nothing else.
bool IsCertificate(std::string_view text) {
    return text.size() <= kMaxCertificateBytes && text.starts_with("-----BEGIN CERTIFICATE-----\n") &&
           text.ends_with("-----END CERTIFICATE-----\n");
}

void RequireValid(soci::session& sql, const RecordingServer& server) {
    if (server.name.empty() || !IsPlainText(server.name, kMaxNameBytes)) {
        throw InvalidRecord("a server's name is 1 to 64 bytes of UTF-8 without control characters");
    }
    if (server.address.empty() ? server.port != 0
                               : !IsAddress(server.address) || server.port < 1 || server.port > 65'535) {
        throw InvalidRecord("a server is reached by a host name or address, and a port from 1 to 65535");
    }
    if (server.address.empty() != server.certificate.empty() ||
        (!server.certificate.empty() && !IsCertificate(server.certificate))) {
        throw InvalidRecord("a server that has an address has a certificate in PEM, of up to 16384 bytes");
    }
    int found = 0;
    sql << "select id from servers where name = :name and id <> :id", soci::use(server.name, "name"),
        soci::use(server.id, "id"), soci::into(found);
    if (sql.got_data()) {
        throw AlreadyExists("there is already a server \"" + server.name + "\"");
    }
}

void RequireSecret(const std::string& secret) {
    if (!IsHex(secret, kSecretDigits)) {
        throw InvalidRecord("the secret of two hosts is 64 hexadecimal digits");
    }
}

void Require(soci::session& sql, int id) {
    int found = 0;
    sql << "update servers set name = name where id = :id returning id", soci::use(id, "id"), soci::into(found);
    if (!sql.got_data()) {
        throw NotFound("there is no server " + std::to_string(id));
    }
}

// condition: what follows "where"; takes first and second.
std::vector<RemoteCamera> FetchCameras(soci::session& sql, const std::string& condition, int first, int second) {
    RemoteCamera camera;
    int video_type = 0;
    int audio = 0;
    soci::statement rows =
        (sql.prepare << "select id, server_id, id_on_server, name, video_type, audio from remote_cameras where " +
                            condition + " order by id",
         soci::use(first, "first"), soci::use(second, "second"), soci::into(camera.id), soci::into(camera.server_id),
         soci::into(camera.id_on_server), soci::into(camera.name), soci::into(video_type), soci::into(audio));
    rows.execute();
    std::vector<RemoteCamera> cameras;
    while (rows.fetch()) {
        camera.video_type = static_cast<base::Codec>(video_type);
        camera.audio = audio != 0;
        cameras.push_back(camera);
    }
    return cameras;
}

constexpr const char* kBetween = "id >= :first and id <= :second";
constexpr const char* kOnServer = "server_id = :first and id_on_server = :second";

std::optional<RemoteCamera> OnlyOne(std::vector<RemoteCamera> found) {
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

void RequireValid(const RemoteCamera& camera) {
    if (camera.name.empty() || !IsPlainText(camera.name, kMaxCameraNameBytes)) {
        throw InvalidRecord("a camera's name is 1 to 255 bytes of UTF-8 without control characters");
    }
    if (camera.id_on_server < 1) {
        throw InvalidRecord("a camera's id on its server is a number from 1");
    }
    if (!base::IsVideo(camera.video_type)) {
        throw InvalidRecord("a camera sends MJPEG, H.264 or H.265");
    }
}

}  // namespace

int RecordingServers::Add(const RecordingServer& server, const std::string& secret) {
    RequireSecret(secret);
    return connection_.Write([&](soci::session& sql) {
        RecordingServer added = server;
        added.id = NextId(sql, "server");
        RequireValid(sql, added);
        const int enabled = added.enabled ? 1 : 0;
        sql << "insert into servers (id, name, address, port, secret, certificate, enabled)"
               " values (:id, :name, :address, :port, :secret, :certificate, :enabled)",
            soci::use(added.id, "id"), soci::use(added.name, "name"), soci::use(added.address, "address"),
            soci::use(added.port, "port"), soci::use(secret, "secret"), soci::use(added.certificate, "certificate"),
            soci::use(enabled, "enabled");
        RaiseRevision(sql);
        return added.id;
    });
}

void RecordingServers::Update(const RecordingServer& server, const std::optional<std::string>& secret) {
    if (secret) {
        RequireSecret(*secret);
    }
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Require(sql, server.id);
        RequireValid(sql, server);
        const int enabled = server.enabled ? 1 : 0;
        sql << "update servers set name = :name, address = :address, port = :port, certificate = :certificate,"
               " enabled = :enabled where id = :id",
            soci::use(server.name, "name"), soci::use(server.address, "address"), soci::use(server.port, "port"),
            soci::use(server.certificate, "certificate"), soci::use(enabled, "enabled"), soci::use(server.id, "id");
        if (secret) {
            sql << "update servers set secret = :secret where id = :id", soci::use(*secret, "secret"),
                soci::use(server.id, "id");
        }
    });
}

void RecordingServers::Remove(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Require(sql, id);
        sql << "delete from camera_ports where camera_id in (select id from remote_cameras where server_id = :id)",
            soci::use(id, "id");
        sql << "delete from devices where server_id = :id", soci::use(id, "id");
        sql << "delete from servers where id = :id", soci::use(id, "id");
    });
}

std::optional<RecordingServer> RecordingServers::Find(int id) {
    std::vector<RecordingServer> found = connection_.Read([&](soci::session& sql) { return Fetch(sql, id, id); });
    return found.empty() ? std::nullopt : std::optional(std::move(found.front()));
}

std::vector<RecordingServer> RecordingServers::List() {
    return connection_.Read([](soci::session& sql) { return Fetch(sql, 1, std::numeric_limits<int>::max()); });
}

std::string RecordingServers::FindSecret(int id) {
    return connection_.Read([&](soci::session& sql) {
        std::string secret;
        sql << "select secret from servers where id = :id and enabled = 1", soci::use(id, "id"), soci::into(secret);
        return sql.got_data() ? secret : std::string();
    });
}

std::vector<std::string> RecordingServers::AskersSecrets() {
    return connection_.Read([](soci::session& sql) {
        std::vector<std::string> secrets;
        std::string secret;
        soci::statement rows =
            (sql.prepare << "select secret from servers where enabled = 1 and address = '' order by id",
             soci::into(secret));
        rows.execute();
        while (rows.fetch()) {
            secrets.push_back(secret);
        }
        return secrets;
    });
}

int RecordingServers::PutCamera(const RemoteCamera& camera) {
    RequireValid(camera);
    return connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        Require(sql, camera.server_id);
        const auto known = OnlyOne(FetchCameras(sql, kOnServer, camera.server_id, camera.id_on_server));
        const int id = known ? known->id : NextId(sql, "camera");
        const int video_type = static_cast<int>(camera.video_type);
        const int audio = camera.audio ? 1 : 0;
        sql << "insert into remote_cameras (id, server_id, id_on_server, name, video_type, audio)"
               " values (:id, :server, :there, :name, :type, :audio) on conflict (id)"
               " do update set name = excluded.name, video_type = excluded.video_type, audio = excluded.audio",
            soci::use(id, "id"), soci::use(camera.server_id, "server"), soci::use(camera.id_on_server, "there"),
            soci::use(camera.name, "name"), soci::use(video_type, "type"), soci::use(audio, "audio");
        return id;
    });
}

void RecordingServers::RemoveCamera(int id) {
    connection_.Write([&](soci::session& sql) {
        RaiseRevision(sql);
        if (FetchCameras(sql, kBetween, id, id).empty()) {
            throw NotFound("there is no remote camera " + std::to_string(id));
        }
        sql << "delete from camera_ports where camera_id = :id", soci::use(id, "id");
        sql << "delete from remote_cameras where id = :id", soci::use(id, "id");
    });
}

std::optional<RemoteCamera> RecordingServers::FindCamera(int id) {
    return OnlyOne(connection_.Read([&](soci::session& sql) { return FetchCameras(sql, kBetween, id, id); }));
}

std::optional<RemoteCamera> RecordingServers::FindCamera(int server_id, int id_on_server) {
    return OnlyOne(
        connection_.Read([&](soci::session& sql) { return FetchCameras(sql, kOnServer, server_id, id_on_server); }));
}

std::vector<RemoteCamera> RecordingServers::ListCameras() {
    return connection_.Read(
        [](soci::session& sql) { return FetchCameras(sql, kBetween, 1, std::numeric_limits<int>::max()); });
}

}  // namespace lookhaven::store
