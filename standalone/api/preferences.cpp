// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/preferences.h"

#include "standalone/admin/preferences.h"

namespace lookhaven::api {

namespace {

std::string AnswerPreferences(Json::Value preferences) {
    Json::Value data;
    data["preferences"] = std::move(preferences);
    return SuccessAnswer(data);
}

}  // namespace

std::string Preferences(const Call& call) {
    return AnswerPreferences(admin::PreferencesOf(call.Records(), call.Actor().user_id));
}

std::string SetPreferences(const Call& call) {
    const int own = call.Actor().user_id;
    if (call.NumberOr("id", own) != own) {
        throw Failure(403, "these are another account's preferences");
    }
    return AnswerPreferences(admin::SetPreferences(call.Records(), own, call.Parameter("preferences")));
}

}  // namespace lookhaven::api
