// SPDX-License-Identifier: Apache-2.0
#include "standalone/admin/preferences.h"

#include <algorithm>
#include <string>

#include "standalone/admin/change.h"
#include "standalone/base/json_text.h"
#include "standalone/store/preferences.h"
#include "standalone/store/text.h"

namespace lookhaven::admin {

namespace {

constexpr std::size_t kMaxNameBytes = 64;

Json::Value FromStored(const std::string& text) {
    Json::Value preferences = base::ParseOneLineJson(text);
    return preferences.isObject() ? preferences : Json::Value(Json::objectValue);
}

bool IsNestedWithin(const Json::Value& value, int depth) {
    return std::all_of(value.begin(), value.end(),
                       [depth](const Json::Value& member) { return depth > 0 && IsNestedWithin(member, depth - 1); });
}

void RequirePreference(const std::string& name, const Json::Value& value) {
    if (name.empty() || !store::IsPlainText(name, kMaxNameBytes)) {
        throw store::InvalidRecord("the name of a preference has 1 to 64 bytes and no control characters");
    }
    if (!IsNestedWithin(value, kMaxPreferenceDepth)) {
        throw store::InvalidRecord("a preference is nested at most " + std::to_string(kMaxPreferenceDepth) + " deep");
    }
}

}  // namespace

Json::Value PreferencesOf(store::Store& store, int user_id) {
    return FromStored(store::Preferences(store).Find(user_id));
}

Json::Value SetPreferences(store::Store& store, int user_id, const Json::Value& changes) {
    if (!changes.isObject()) {
        throw store::InvalidRecord("preferences are one JSON object");
    }
    // Before the store is locked. All of them may be replaced at once, each by one of another name.
    if (changes.size() > 2 * kMaxPreferences) {
        throw store::InvalidRecord("an account has at most " + std::to_string(kMaxPreferences) + " preferences");
    }
    for (const std::string& name : changes.getMemberNames()) {
        RequirePreference(name, changes[name]);
    }
    Json::Value preferences;
    store::Preferences(store).Change(user_id, [&](const std::string& stored) {
        preferences = FromStored(stored);
        for (const std::string& name : changes.getMemberNames()) {
            if (changes[name].isNull()) {
                preferences.removeMember(name);
            } else {
                preferences[name] = changes[name];
            }
        }
        if (preferences.size() > kMaxPreferences) {
            throw store::InvalidRecord("an account has at most " + std::to_string(kMaxPreferences) + " preferences");
        }
        std::string text = base::OneLineJson(preferences);
        if (text.size() > kMaxPreferencesBytes) {
            throw store::InvalidRecord("the preferences of an account have at most " +
                                       std::to_string(kMaxPreferencesBytes) + " bytes");
        }
        return text;
    });
    return preferences;
}

}  // namespace lookhaven::admin
