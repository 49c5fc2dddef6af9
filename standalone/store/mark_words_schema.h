// SPDX-License-Identifier: Apache-2.0
//
// How either engine finds marks by the words in their texts: steps of the schema (schema.cpp) that search in
// mark_search.cpp relies on.
#pragma once

namespace lookhaven::store {

// The words in texts of marks, which triggers keep in step: start and id of a mark are the row, so that the newest come
// first out of the index. Its texts are not stored a second time, so that what is removed is told with its words.
inline constexpr const char* kMarkWordsOnSqlite[] = {
    "create virtual table mark_words using fts5(words, tags, content = '', columnsize = 0,"
    " tokenize = 'unicode61 remove_diacritics 0')",
    "create trigger mark_words_added after insert on marks when new.text <> '' begin"
    " insert into mark_words (rowid, words, tags) values"
    " ((new.start_s << 32) | new.id, new.text, 'c' || new.camera_id || ' k' || new.kind); end",
    "create trigger mark_words_removed after delete on marks when old.text <> '' begin"
    " insert into mark_words (mark_words, rowid, words, tags) values"
    " ('delete', (old.start_s << 32) | old.id, old.text, 'c' || old.camera_id || ' k' || old.kind); end",
    "insert into mark_words (rowid, words, tags) select (start_s << 32) | id, text, 'c' || camera_id || ' k' || kind"
    " from marks where text <> '' order by start_s, id",
};

// Functions, so that index and searches have one form of the words. What stands between words becomes a space, since
// the parser would take "door/yard" for a path and "12.80" for one number. A database whose locale is C knows
// small letters and capitals of ASCII alone, so it is told the letters of all scripts, where its server has them. The
// index's function calls functions of the server alone: maintenance and restoring look nothing up in our schema.
inline constexpr const char* kMarkWordsOnPostgresql[] = {
    R"(do $do$
declare letters text := case when exists (select 1 from pg_collation where collname = 'und-x-icu')
    then ' collate "und-x-icu"' else '' end;
begin
    execute 'create function mark_small(text text) returns text language sql immutable parallel safe as '
        || '$small$ select lower(text' || letters || ') $small$';
    execute 'create function mark_words(text text) returns tsvector language sql immutable parallel safe as '
        || '$words$ select to_tsvector(''pg_catalog.simple'', regexp_replace(lower(text' || letters || ')' || letters
        || ', ''[^[:alnum:]]+'', '' '', ''g'')) $words$';
end $do$)",
    "create index marks_by_words on marks using gin (mark_words(text))",
    "create index marks_by_time on marks (start_s, id)",
};

// With the camera in the index of words, for searches whose words are others' cameras'. The old one goes last: it takes
// minutes to make an index, in which others read.
inline constexpr const char* kMarkWordsByCameraOnPostgresql[] = {
    "create index marks_by_words_and_camera on marks using gin (mark_words(text), (array[camera_id]))",
    "drop index marks_by_words",
};

}  // namespace lookhaven::store
