// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/call.h"

namespace lookhaven::api {

const Json::Value& Call::Parameter(const std::string& name) const {
    const auto found = parameters.find(name);
    return found == parameters.end() ? Json::Value::nullSingleton() : found->second;
}

std::int64_t Call::NumberOr(const std::string& name, std::int64_t fallback) const {
    const Json::Value& value = Parameter(name);
    return value.isNull() ? fallback : value.asInt64();
}

admin::Actor Call::Actor() const {
    const binding::Login& caller = login.value();
    return {static_cast<int>(caller.user_id), caller.account, std::string(request.Header("REMOTE_ADDR"))};
}

std::string SuccessAnswer(const Json::Value& data, const std::string& extra) {
    return http::JsonAnswer(200, binding::SuccessText(data), extra);
}

}  // namespace lookhaven::api
