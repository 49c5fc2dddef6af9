// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/schema.h"

#include "standalone/store/mark_words_schema.h"
#include "standalone/store/month_partitions_schema.h"

namespace lookhaven::store {

namespace {

constexpr const char* kAccountsAndCameras[] = {
    // Ids come from here and not from the table, so that one is never given again after a removal.
    "create table counters (name text not null primary key, value bigint not null)",
    "insert into counters (name, value) values ('user', 0), ('camera', 0), ('revision', 1)",

    "create table users (id integer not null primary key, name text not null, password_hash text not null,"
    " privilege integer not null)",
    "create unique index users_by_name on users (lower(name))",
    // No reference to cameras: recordings outlive their camera and stay denied.
    "create table denied_cameras (user_id integer not null references users (id) on delete cascade,"
    " camera_id integer not null, access integer not null, primary key (user_id, access, camera_id))",

    "create table sessions (secret_hash text not null primary key, handle text not null unique,"
    " user_id integer not null references users (id) on delete cascade, created bigint not null,"
    " last_seen bigint not null, expires bigint not null)",
    "create index sessions_by_user on sessions (user_id)",
    "create index sessions_by_end on sessions (expires)",
    "create table login_attempts (origin text not null primary key, attempts integer not null, since bigint not null)",

    "create table cameras (id integer not null primary key, name text not null, enabled integer not null,"
    " video_type integer not null, live_profile integer not null, ptz integer not null, audio integer not null)",
    "create table camera_profiles (camera_id integer not null references cameras (id) on delete cascade,"
    " number integer not null, source text not null, width integer not null, height integer not null,"
    " fps integer not null, primary key (camera_id, number))",
    "create table camera_credentials (camera_id integer not null primary key"
    " references cameras (id) on delete cascade, account text not null, password text not null)",

    "create table settings (name text not null primary key, value text not null)",
};

constexpr const char* kRecordings[] = {
    "insert into counters (name, value) values ('event', 0), ('mount', 0), ('group', 0)",

    "create table mounts (id integer not null primary key, name text not null unique, path text not null unique,"
    " max_bytes bigint not null, max_age bigint not null, enabled integer not null, is_default integer not null)",
    "create table recording_plans (camera_id integer not null primary key references cameras (id) on delete cascade,"
    " mode integer not null, segment integer not null, pre_record integer not null, post_record integer not null,"
    " mount_id integer not null, profile integer not null)",

    // No reference to cameras here either: recordings outlive their camera.
    "create table events (id integer not null primary key, camera_id integer not null, mount_id integer not null,"
    " start_s bigint not null, end_s bigint not null, recording integer not null, reason integer not null,"
    " frame_count integer not null, size_bytes bigint not null, video_type integer not null,"
    " audio_codec text not null, width integer not null, height integer not null, path text not null,"
    " archived integer not null, demo integer not null)",
    "create index events_by_start on events (camera_id, start_s)",
    "create index events_by_mount on events (mount_id, camera_id, id)",
    // Partial, so that growing and demo events cost nothing here. With the size, so that the sum of a mount is
    // read from the index alone.
    "create index events_by_age on events (mount_id, start_s, size_bytes)"
    " where recording = 0 and archived = 0 and demo = 0",
    "create index events_archived on events (mount_id) where archived = 1",
    "create index events_open on events (id) where recording = 1",
    "create index events_demo on events (id) where demo = 1",

    "create table marks (id integer not null primary key, kind integer not null, camera_id integer not null,"
    " moment_s bigint not null, start_s bigint not null, end_s bigint not null, text text not null,"
    " state integer not null, mount_id integer not null, path text not null, demo integer not null)",
    "create index marks_by_start on marks (camera_id, start_s)",
    "create index marks_by_mount on marks (mount_id, id)",
    "create index marks_pending on marks (end_s) where state = 0",
    "create index marks_demo on marks (id) where demo = 1",

    "create table camera_groups (id integer not null primary key, name text not null unique)",
    "create table group_cameras (group_id integer not null references camera_groups (id) on delete cascade,"
    " camera_id integer not null, primary key (group_id, camera_id))",
    "create table denied_groups (user_id integer not null references users (id) on delete cascade,"
    " group_id integer not null references camera_groups (id) on delete cascade, access integer not null,"
    " primary key (user_id, access, group_id))",
};

constexpr const char* kEmaps[] = {
    "insert into counters (name, value) values ('emap', 0), ('door', 0), ('io', 0), ('pos', 0), ('server', 0)",

    "create table servers (id integer not null primary key, name text not null unique, address text not null,"
    " port integer not null, secret text not null, certificate text not null, enabled integer not null)",
    "create table remote_cameras (id integer not null primary key,"
    " server_id integer not null references servers (id) on delete cascade, id_on_server integer not null,"
    " name text not null, video_type integer not null, audio integer not null, unique (server_id, id_on_server))",

    "create table emaps (id integer not null primary key, name text not null unique, image text not null,"
    " hide_names integer not null, small_items integer not null, revision integer not null)",
    "create table emap_items (emap_id integer not null references emaps (id) on delete cascade,"
    " place integer not null, type integer not null, device_id integer not null, name text not null,"
    " server_id integer not null, x integer not null, y integer not null, direction integer not null,"
    " text_pos integer not null, icon_center_x integer not null, icon_center_y integer not null,"
    " port integer not null, primary key (emap_id, place))",

    // server_id 0 is this host, so no reference.
    "create table devices (kind integer not null, id integer not null, name text not null,"
    " server_id integer not null, id_on_server integer not null, camera_id integer not null,"
    " primary key (kind, id), unique (kind, server_id, id_on_server))",
    "create table device_ports (kind integer not null, device_id integer not null, port integer not null,"
    " type integer not null, camera_id integer not null, primary key (kind, device_id, port),"
    " foreign key (kind, device_id) references devices (kind, id) on delete cascade)",
    "create table device_states (kind integer not null, device_id integer not null, port integer not null,"
    " state text not null, since_s bigint not null, primary key (kind, device_id, port),"
    " foreign key (kind, device_id) references devices (kind, id) on delete cascade)",
    // The ports of this host's cameras and of paired hosts' cameras.
    "create table camera_ports (camera_id integer not null primary key, inputs integer not null,"
    " outputs integer not null)",

    "create table denied_items (user_id integer not null references users (id) on delete cascade,"
    " kind integer not null, item_id integer not null, primary key (user_id, kind, item_id))",
};

// Who reported a mark, and when: by number, since names are given again, and by the name of that day.
constexpr const char* kReporters[] = {
    "alter table users add column may_mark integer not null default 0",
    "alter table marks add column reporter_id integer not null default 0",
    "alter table marks add column reporter text not null default ''",
    "alter table marks add column reported_s bigint not null default 0",
    "create index marks_by_reporter on marks (reporter_id, reported_s) where reporter_id <> 0",
};

constexpr const char* kRecordingOrder[] = {
    // Rows whose files retention is removing: out of every search, and restored where a file cannot be removed.
    "create table events_pending_deletion (id integer not null primary key, camera_id integer not null,"
    " mount_id integer not null, start_s bigint not null, end_s bigint not null, recording integer not null,"
    " reason integer not null, frame_count integer not null, size_bytes bigint not null, video_type integer not null,"
    " audio_codec text not null, width integer not null, height integer not null, path text not null,"
    " archived integer not null, demo integer not null)",
    "drop index events_by_age",
    // Partial, so that growing and demo events cost nothing here. With the size, so that the sum of a mount is
    // read from the index alone.
    "create index events_by_order on events (mount_id, id, size_bytes)"
    " where recording = 0 and archived = 0 and demo = 0",

    "create table recorder_lease (count bigint not null primary key, holder text not null,"
    " first_reserved_id integer not null)",
    "insert into recorder_lease (count, holder, first_reserved_id) values (0, '', 2147483647)",
};

// Before this version certificates were not verified: existing HTTPS cameras keep working, marked insecure.
constexpr const char* kInsecureCameras[] = {
    "alter table cameras add column insecure integer not null default 0",
    "update cameras set insecure = 1 where id in (select camera_id from camera_profiles where source like 'https:%')",
};

// The order was that of ids, which says nothing of an old recording that got a new one.
constexpr const char* kRenumberedRecordings[] = {
    // A recorder of an earlier version may still add rows: not the first to be deleted.
    "alter table events add column recording_order bigint not null default 9223372036854775807",
    "update events set recording_order = id",
    "alter table events_pending_deletion add column recording_order bigint not null default 0",
    "update events_pending_deletion set recording_order = id",
    "drop index events_by_order",
    ("create index events_by_order on events (mount_id, recording_order, id, size_bytes)"
     " where recording = 0 and archived = 0 and demo = 0"),
};

constexpr const char* kPendingReports[] = {
    "create index marks_pending_by_reporter on marks (reporter_id, reported_s) where state = 0 and reporter_id <> 0",
};

// Their secrets carry no tag.
constexpr const char* kTaggedSessions[] = {"delete from sessions"};

// Alarms are few among continuous recordings, and are looked for by themselves.
constexpr const char* kAlarms[] = {
    "create index events_by_alarm on events (camera_id, start_s) where reason <> 1",
};

// A row is never changed, only deleted, the oldest first.
constexpr const char* kAuditLog[] = {
    "insert into counters (name, value) values ('audit', 0)",
    "create table audit_log (id integer not null primary key, time_s bigint not null, user_id integer not null,"
    " who text not null, address text not null, action text not null, object text not null,"
    " before_change text not null, after_change text not null)",
};

// Ids grow, so that a new camera comes last.
constexpr const char* kCameraOrder[] = {
    "alter table cameras add column place integer not null default 0",
    "update cameras set place = id",
};

constexpr const char* kSchedules[] = {
    "alter table recording_plans add column hours text not null default ''",
};

constexpr const char* kSessionAddresses[] = {
    "alter table sessions add column address text not null default ''",
};

// Why events are kept; "archived" in their rows says that they are.
constexpr const char* kKeptEvents[] = {
    ("create table kept_events (event_id integer not null primary key references events (id) on delete cascade,"
     " note text not null, keeper text not null, kept_s bigint not null)"),
    "insert into kept_events (event_id, note, keeper, kept_s) select id, '', '', 0 from events where archived = 1",
    "create index events_kept on events (camera_id, start_s) where archived = 1",
};

// One JSON object each.
constexpr const char* kPreferences[] = {
    ("create table preferences (user_id integer not null primary key references users (id) on delete cascade,"
     " value text not null)"),
};

// A lease is one host's while that host's heartbeat changes. Hosts may each have a mount at the same path.
constexpr const char* kHosts[] = {
    "insert into counters (name, value) values ('host', 0)",
    ("create table hosts (id integer not null primary key, name text not null unique, address text not null,"
     " port integer not null, certificate text not null, version text not null, draining integer not null,"
     " has_room integer not null, heartbeat bigint not null, holder text not null,"
     " first_reserved_id integer not null)"),
    // No reference to hosts: a host that was removed leaves its footage, and cameras that wait for it.
    "alter table cameras add column host_id integer not null default 0",
    "alter table mounts add column host_id integer not null default 0",
    ("create table camera_leases (camera_id integer not null primary key references cameras (id) on delete cascade,"
     " host_id integer not null, count bigint not null, next_host_id integer not null)"),
};
constexpr const char* kMountPathsOnSqlite[] = {
    ("create table mounts_of_hosts (id integer not null primary key, name text not null unique, path text not null,"
     " max_bytes bigint not null, max_age bigint not null, enabled integer not null, is_default integer not null,"
     " host_id integer not null default 0)"),
    ("insert into mounts_of_hosts (id, name, path, max_bytes, max_age, enabled, is_default, host_id)"
     " select id, name, path, max_bytes, max_age, enabled, is_default, host_id from mounts"),
    "drop table mounts",
    "alter table mounts_of_hosts rename to mounts",
};
constexpr const char* kMountPathsOnPostgresql[] = {
    "alter table mounts drop constraint mounts_path_key",
};

// For hosts that share the store; content is base64.
constexpr const char* kEmapPictures[] = {
    ("create table emap_pictures (name text not null primary key, content text not null, touched_s bigint not null)"),
};

// What a device presents is found by its handle; the hash is that of the whole secret.
constexpr const char* kAccessTokens[] = {
    "insert into counters (name, value) values ('token', 0)",
    ("create table access_tokens (id integer not null primary key, name text not null unique,"
     " may_alert integer not null, may_pos integer not null, created_s bigint not null, creator text not null,"
     " last_use_s bigint not null, expires_s bigint not null, handle text not null unique, secret_hash text not null)"),
    ("create table access_token_cameras (token_id integer not null references access_tokens (id) on delete cascade,"
     " camera_id integer not null references cameras (id) on delete cascade, primary key (token_id, camera_id))"),
};

// For cameras whose recordings go earlier than others on their mount. The index is first: it takes minutes to make one
// of a large table, in which others read cameras.
constexpr const char* kMaxAgesOfCameras[] = {
    ("create index events_of_camera_by_order on events (camera_id, mount_id, recording_order, id)"
     " where recording = 0 and archived = 0 and demo = 0"),
    "alter table cameras add column max_age bigint not null default 0",
};

// What cameras send and what hosts have to record it with; 0 until that is measured.
constexpr const char* kLoads[] = {
    "alter table camera_leases add column bytes_per_second bigint not null default 0",
    "alter table hosts add column processors integer not null default 0",
};

// A shared mount has host_id -1, which older programs take for another host's.
constexpr const char* kSharedMounts[] = {
    // The host that records the event; 0 where programs do not say it.
    "alter table events add column host_id integer not null default 0",
    "alter table events_pending_deletion add column host_id integer not null default 0",
    ("create table shared_mount_hosts (mount_id integer not null references mounts (id) on delete cascade,"
     " host_id integer not null references hosts (id) on delete cascade, primary key (mount_id, host_id))"),
    ("create table mount_leases (mount_id integer not null primary key references mounts (id) on delete cascade,"
     " host_id integer not null references hosts (id) on delete cascade, count bigint not null default 0)"),
    // No reference to hosts: what one that was removed has recorded is still to be recovered.
    ("create table event_id_blocks (first_id integer not null primary key, ids integer not null,"
     " host_id integer not null)"),
};

constexpr Migration kMigrations[] = {
    {"accounts, sessions, cameras, settings", kAccountsAndCameras},
    {"recorded events, marks, mounts, recording plans, camera groups", kRecordings},
    {"e-maps, their devices, paired hosts", kEmaps},
    {"who reported a mark, and who may", kReporters},
    {"events pending deletion, the order of recording, the recorder lease", kRecordingOrder},
    {"cameras whose HTTPS certificate is not verified", kInsecureCameras},
    {"the order of recordings that got a new id", kRenumberedRecordings},
    {"reports whose footage is still to come", kPendingReports},
    {"sessions whose secret carries a tag", kTaggedSessions},
    {"alarms among continuous recordings", kAlarms},
    {"the audit log", kAuditLog},
    {"the order of cameras", kCameraOrder},
    {"recording by the hour of the week", kSchedules},
    {"where a log-in came from", kSessionAddresses},
    {"why events are kept", kKeptEvents},
    {"the words in texts of marks", {}, kMarkWordsOnSqlite, kMarkWordsOnPostgresql},
    {"what accounts prefer", kPreferences},
    {"hosts that share the store", kHosts, kMountPathsOnSqlite, kMountPathsOnPostgresql},
    {.purpose = "pictures of e-maps that hosts share", .statements = kEmapPictures, .is_addition = true},
    {.purpose = "the words in texts of marks by camera",
     .statements = {},
     .on_postgresql = kMarkWordsByCameraOnPostgresql,
     .is_addition = true},
    {.purpose = "access tokens", .statements = kAccessTokens, .is_addition = true},
    {.purpose = "the maximum age of a camera's recordings", .statements = kMaxAgesOfCameras, .is_addition = true},
    {.purpose = "the load of hosts that share the store", .statements = kLoads, .is_addition = true},
    {.purpose = "mounts that hosts share", .statements = kSharedMounts, .is_addition = true},
    {.purpose = "partitions by month",
     .statements = {},
     .on_postgresql = kMonthPartitionsOnPostgresql,
     .is_addition = true},
};

}  // namespace

std::span<const Migration> Migrations() {
    return kMigrations;
}

}  // namespace lookhaven::store
