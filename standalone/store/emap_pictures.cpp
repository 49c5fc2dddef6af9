// SPDX-License-Identifier: Apache-2.0
#include "standalone/store/emap_pictures.h"

#include "standalone/base/text.h"
#include "standalone/store/connection.h"

namespace lookhaven::store {

void EmapPictures::Put(const std::string& name, std::string_view bytes, std::int64_t now_s) {
    connection_.Execute("insert into emap_pictures (name, content, touched_s) values (:name, :content, :now)"
                        " on conflict (name) do nothing",
                        name, base::ToBase64(bytes), now_s);
}

std::optional<std::string> EmapPictures::Find(const std::string& name) {
    const auto content =
        connection_.FetchOne<std::string>("select content from emap_pictures where name = :name", name);
    return content ? base::FromBase64(*content) : std::nullopt;
}

void EmapPictures::Touch(const std::string& name, std::int64_t now_s) {
    connection_.Execute("update emap_pictures set touched_s = :now where name = :name", now_s, name);
}

void EmapPictures::Withdraw(const std::string& name) {
    connection_.Execute("delete from emap_pictures where name = :name"
                        " and not exists (select 1 from emaps where image = emap_pictures.name)",
                        name);
}

void EmapPictures::RemoveUnused(std::int64_t before_s) {
    connection_.Execute("delete from emap_pictures where touched_s < :before"
                        " and not exists (select 1 from emaps where image = emap_pictures.name)",
                        before_s);
}

std::vector<std::string> EmapPictures::Missing() {
    return connection_.FetchAll<std::string>(
        "select image from emaps where image <> ''"
        " and not exists (select 1 from emap_pictures where name = emaps.image) order by id");
}

}  // namespace lookhaven::store
