// SPDX-License-Identifier: Apache-2.0
//
// How PostgreSQL comes to divide events and marks by the month: a step of the schema (schema.cpp) that
// month_partitions.cpp relies on.
#pragma once

namespace lookhaven::store {

// The existing table becomes one partition, "…_earlier", up to the next month; what is dated later goes to the default
// one, "…_default", which has what no other takes. An empty table becomes no partition. Nothing else is copied: each
// index is declared again as it was, since PostgreSQL attaches an equal one of the old table instead of building it;
// they are renamed to free their names. Only the primary key's is built.
//
// The key of a partitioned table must hold the column that it is partitioned by, so PostgreSQL no longer enforces that
// ids are unique: the counter does, and Events::Begin. A foreign key cannot refer to an event by its id alone, so a
// trigger removes the row of kept_events.
//
// event_cameras     the pairs of camera and mount that have events, so that no search looks for them in each month.
//                   Adding an event locks its pair's row in share mode, forgetting a pair locks it exclusively: so no
//                   pair is removed while an event of it is added. The triggers run for statements that name "events",
//                   not for what moves between partitions: never remove events from a partition directly.
// month_first_ids   the next id, of events and marks alike, when a month was first seen: tells FindById in which months
//                   to look first
inline constexpr const char* kMonthPartitionsOnPostgresql[] = {
    "create table month_first_ids (start_s bigint not null primary key, first_id integer not null)",
    ("create table event_cameras (camera_id integer not null, mount_id integer not null,"
     " primary key (mount_id, camera_id))"),
    // In the order of deletions, which go on to kept_events: otherwise each might wait for the other.
    "lock table events, marks, kept_events",
    "alter table kept_events drop constraint kept_events_event_id_fkey",
    R"(do $do$
declare
    parent text;
    own_index text;
    following bigint := extract(epoch from date_trunc('month', now() at time zone 'UTC') + interval '1 month');
    has_rows boolean;
begin
    foreach parent in array array['events', 'marks'] loop
        execute format('alter table %I rename to %I', parent, parent || '_earlier');
        execute format('alter table %I drop constraint %I', parent || '_earlier', parent || '_pkey');
        for own_index in select indexname from pg_indexes
            where schemaname = current_schema() and tablename = parent || '_earlier' loop
            execute format('alter index %I rename to %I', own_index, own_index || '_earlier');
        end loop;
        execute format('create table %I (like %I including defaults) partition by range (start_s)', parent,
                       parent || '_earlier');
        execute format('create table %I partition of %I default', parent || '_default', parent);
        execute format('select exists (select from %I)', parent || '_earlier') into has_rows;
        if has_rows then
            execute format('insert into %I select * from %I where start_s >= $1', parent, parent || '_earlier')
                using following;
            execute format('delete from %I where start_s >= $1', parent || '_earlier') using following;
            execute format('alter table %I attach partition %I for values from (minvalue) to (%s)', parent,
                           parent || '_earlier', following);
        else
            execute format('drop table %I', parent || '_earlier');
        end if;
    end loop;
end $do$)",
    "alter table events add primary key (id, start_s)",
    "create index events_by_start on events (camera_id, start_s)",
    "create index events_by_mount on events (mount_id, camera_id, id)",
    ("create index events_by_order on events (mount_id, recording_order, id, size_bytes)"
     " where recording = 0 and archived = 0 and demo = 0"),
    ("create index events_of_camera_by_order on events (camera_id, mount_id, recording_order, id)"
     " where recording = 0 and archived = 0 and demo = 0"),
    "create index events_by_alarm on events (camera_id, start_s) where reason <> 1",
    "create index events_kept on events (camera_id, start_s) where archived = 1",
    "create index events_archived on events (mount_id) where archived = 1",
    "create index events_open on events (id) where recording = 1",
    "create index events_demo on events (id) where demo = 1",
    "alter table marks add primary key (id, start_s)",
    "create index marks_by_start on marks (camera_id, start_s)",
    "create index marks_by_time on marks (start_s, id)",
    "create index marks_by_mount on marks (mount_id, id)",
    "create index marks_by_words_and_camera on marks using gin (mark_words(text), (array[camera_id]))",
    "create index marks_by_reporter on marks (reporter_id, reported_s) where reporter_id <> 0",
    "create index marks_pending on marks (end_s) where state = 0",
    "create index marks_pending_by_reporter on marks (reporter_id, reported_s) where state = 0 and reporter_id <> 0",
    "create index marks_demo on marks (id) where demo = 1",
    "insert into event_cameras (camera_id, mount_id) select distinct camera_id, mount_id from events",
    R"(create function event_added() returns trigger language plpgsql set search_path from current as $added$
declare
    pair record;
begin
    for pair in select distinct camera_id, mount_id from added order by mount_id, camera_id loop
        loop
            perform 1 from event_cameras where camera_id = pair.camera_id and mount_id = pair.mount_id for key share;
            exit when found;
            -- Again where another transaction adds or removes the pair between the two.
            insert into event_cameras (camera_id, mount_id) values (pair.camera_id, pair.mount_id)
                on conflict do nothing;
            exit when found;
        end loop;
    end loop;
    return null;
end $added$)",
    ("create trigger event_added after insert on events referencing new table as added"
     " for each statement execute function event_added()"),
    R"(create function forget_event_camera(camera integer, mount integer) returns void language plpgsql
    set search_path from current as $forget$
begin
    perform 1 from event_cameras where camera_id = camera and mount_id = mount for update;
    delete from event_cameras where camera_id = camera and mount_id = mount
        and not exists (select from events where camera_id = camera and mount_id = mount);
end $forget$)",
    R"(create function event_removed() returns trigger language plpgsql set search_path from current as $removed$
begin
    delete from kept_events where event_id in (select id from removed where archived = 1);
    perform forget_event_camera(camera_id, mount_id)
        from (select distinct camera_id, mount_id from removed order by mount_id, camera_id) as pair
        where not exists (select from events where camera_id = pair.camera_id and mount_id = pair.mount_id);
    return null;
end $removed$)",
    ("create trigger event_removed after delete on events referencing old table as removed"
     " for each statement execute function event_removed()"),
};

}  // namespace lookhaven::store
