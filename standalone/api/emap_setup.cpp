// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/emap_setup.h"

#include <map>
#include <set>
#include <vector>

#include "standalone/admin/change.h"
#include "standalone/admin/emaps.h"
#include "standalone/api/fields.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/revision.h"
#include "standalone/binding/common_record.h"

namespace lookhaven::api {

namespace {

constexpr std::size_t kMaxConcurrent = 3;

// What an answer has of each map besides its record.
struct Use {
    explicit Use(store::Store& records) : maps(store::Emaps(records).List()), links(store::Emaps(records).Links()) {}

    Json::Value Complete(Json::Value record) const {
        const int id = record["id"].asInt();
        const auto linking = links.find(id);
        record["items"] = 0;
        record["linkedFrom"] = Json::arrayValue;
        for (const store::EmapSummary& emap : maps) {
            if (emap.id == id) {
                record["items"] = emap.item_count;
            } else if (linking != links.end() && linking->second.contains(emap.id)) {
                Json::Value& link = record["linkedFrom"].append(Json::objectValue);
                link["id"] = emap.id;
                link["name"] = emap.name;
            }
        }
        return record;
    }

    std::vector<store::EmapSummary> maps;
    std::map<int, std::set<int>> links;
};

auto Completer(const Call& call) {
    return [&call](const Json::Value& record) { return Use(call.Records()).Complete(record); };
}

std::string AnswerRecord(const Call& call, const store::Emap& emap) {
    Json::Value data;
    data["emap"] = Use(call.Records()).Complete(admin::EmapRecord(emap));
    return SuccessAnswer(data);
}

std::string RequireName(const Call& call) {
    const Json::Value& name = call.Parameter("name");
    if (!name.isConvertibleTo(Json::stringValue) || name.isNull()) {
        throw Failure(400, "name must be a text");
    }
    return name.asString();
}

emap::MapPicture DrawnPicture(const Call& call) {
    if (!IsPictureUpload(call)) {
        throw Failure(400, "the body must be the picture's file, and its Content-Type not that of a form");
    }
    if (!call.slots.BeginProbing(call.slot, kMaxConcurrent)) {
        throw Failure(429, "three pictures or cameras are being processed already; try again in a moment",
                      http::kRetrySoonSeconds);
    }
    call.context.CloseRecords();
    return emap::MapPicture::Reencoded(call.request.body, [&call] {
        call.slots.KeepOnly(call.slot);
        binding::ReleaseCommonRecord();
    });
}

std::string Change(const Call& call, std::int64_t seen, const admin::EmapChange& change) {
    return AnswerRecord(call, OnCurrentRecord(Completer(call), [&] {
                            return admin::SetEmap(call.Records(), call.Actor(), call.context.Installation().Home(),
                                                  IdIn(call, "emap"), seen, change);
                        }));
}

}  // namespace

bool IsPictureUpload(const Call& call) {
    const std::string_view type = call.request.Header("CONTENT_TYPE");
    const Json::Value& method = call.Parameter("method");
    return call.Parameter("api") == kEmapApi.name && (method == "Add" || method == "Picture") &&
           call.request.Header("REQUEST_METHOD") == "POST" && !type.starts_with("application/json") &&
           !type.starts_with("application/x-www-form-urlencoded");
}

std::string ListEmaps(const Call& call) {
    const Use use(call.Records());
    Json::Value data;
    data["emap"] = Json::arrayValue;
    for (const store::EmapSummary& emap : use.maps) {
        data["emap"].append(use.Complete(admin::EmapRecord(emap)));
    }
    return SuccessAnswer(data);
}

std::string AddEmap(const Call& call) {
    admin::EmapChange change{.name = RequireName(call)};
    change.picture = DrawnPicture(call);
    return AnswerRecord(call, admin::AddEmap(call.Records(), call.Actor(), call.context.Installation().Home(), change));
}

std::string SetEmapPicture(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    OnCurrentRecord(Completer(call), [&] {  // before the picture costs anything
        admin::RequireCurrent(admin::EmapRecord(admin::RequireEmap(call.Records(), IdIn(call, "emap"))), seen);
    });
    return Change(call, seen, {.picture = DrawnPicture(call)});
}

std::string RenameEmap(const Call& call) {
    return Change(call, SeenRevision(call), {.name = RequireName(call)});
}

std::string RemoveEmap(const Call& call) {
    const std::int64_t seen = SeenRevision(call);
    OnCurrentRecord(Completer(call), [&] {
        admin::RemoveEmap(call.Records(), call.Actor(), call.context.Installation().Home(), IdIn(call, "emap"), seen);
    });
    return SuccessAnswer(Json::objectValue);
}

std::string MayUpload(const Call& /*call*/) {
    return SuccessAnswer(Json::objectValue);
}

}  // namespace lookhaven::api
