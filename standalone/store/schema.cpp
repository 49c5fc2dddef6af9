// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/schema.h"

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

constexpr Migration kMigrations[] = {
    {"accounts, sessions, cameras, settings", kAccountsAndCameras},
};

}  // namespace

std::span<const Migration> Migrations() {
    return kMigrations;
}

}  // namespace lookhaven::store
