// SPDX-License-Identifier: Apache-2.0
#include "standalone/binding/request.h"

#include <algorithm>
#include <array>
#include <memory>
#include <sstream>

#include "standalone/binding/compact_json.h"

namespace {

bool IsOneOf(std::string_view name, std::initializer_list<std::string_view> names) {
    return std::find(names.begin(), names.end(), name) != names.end();
}

std::optional<Json::Value> StrictJson(const std::string& text) {
    Json::CharReaderBuilder builder;
    Json::CharReaderBuilder::strictMode(&builder.settings_);
    builder["strictRoot"] = false;
    const std::unique_ptr<Json::CharReader> reader(builder.newCharReader());
    Json::Value value;
    try {
        if (reader->parse(text.data(), text.data() + text.size(), &value, nullptr)) {
            return value;
        }
    } catch (const Json::Exception&) {
        // Nested too deep to be meant as JSON.
    }
    return std::nullopt;
}

constexpr unsigned int kSafeDigits = 15;  // the most that every decimal fraction keeps

Json::StreamWriterBuilder ScalarStyle() {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    builder["emitUTF8"] = true;
    builder["precision"] = kSafeDigits;
    return builder;
}

// Writes one value after the other. To make a writer costs more than to write a number.
class ScalarWriter {
  public:
    std::string TextOf(const Json::Value& scalar) {
        stream_.str({});
        writer_->write(scalar, &stream_);
        return stream_.str();
    }

  private:
    std::unique_ptr<Json::StreamWriter> writer_{ScalarStyle().newStreamWriter()};
    std::ostringstream stream_;
};

// True when writing each value inside text gives the same text again; spaces and the order of names are free.
bool IsReproduced(const Json::Value& value, std::string_view text, ScalarWriter& writer) {
    if (value.isObject() || value.isArray()) {
        return std::all_of(value.begin(), value.end(),
                           [&](const Json::Value& member) { return IsReproduced(member, text, writer); });
    }
    const auto start = static_cast<std::size_t>(value.getOffsetStart());
    return writer.TextOf(value) == text.substr(start, static_cast<std::size_t>(value.getOffsetLimit()) - start);
}

}  // namespace

namespace lookhaven::binding {

bool IsAlwaysText(std::string_view name) {
    return name == "account" || name == "password" || name == "cookie";
}

Json::Value JsonFromText(std::string_view name, const std::string& text) {
    constexpr std::string_view kFirstBytes = "-0123456789tfn\"[{";
    if (!text.empty() && kFirstBytes.find(text.front()) != kFirstBytes.npos && !IsAlwaysText(name)) {
        std::optional<Json::Value> value = StrictJson(text);
        const bool is_scalar = value && !value->isObject() && !value->isArray();
        ScalarWriter writer;
        if (value && (is_scalar ? writer.TextOf(*value) == text : IsReproduced(*value, text, writer))) {
            return *std::move(value);
        }
    }
    return text;
}

std::string SuccessText(const Json::Value& data) {
    std::string text = R"({"data":)";
    AppendCompactJson(text, data);
    return text += R"(,"success":true})";
}

}  // namespace lookhaven::binding

namespace VEXO {

APIRequest::APIRequest(Context& context) : m_pContext(&context) {}

Json::Value APIRequest::GetParam(const std::string& name, const Json::Value& defaultValue) const {
    if (name.empty()) {
        Json::Value all(Json::objectValue);
        for (const auto& [key, value] : m_pContext->parameters) {
            if (!IsOneOf(key, {"password", "cookie"})) {
                all[key] = value;
            }
        }
        return all;
    }
    const auto found = m_pContext->parameters.find(name);
    if (found == m_pContext->parameters.end() || (defaultValue.isBool() && !found->second.isBool())) {
        return defaultValue.isString() ? lookhaven::binding::JsonFromText(name, defaultValue.asString()) : defaultValue;
    }
    return found->second;
}

std::string APIRequest::GetAPIMethod() const {
    return m_pContext->method;
}

unsigned int APIRequest::GetLoginUID() const {
    return m_pContext->login ? m_pContext->login->user_id : 0;
}

std::string APIRequest::GetLoginUserName() const {
    return m_pContext->login ? m_pContext->login->account : "";
}

std::string APIRequest::GetSessionID() const {
    return m_pContext->login ? m_pContext->login->session_handle : "";
}

std::string APIRequest::GetRemoteIP() const {
    return m_pContext->remote_ip;
}

std::string APIRequest::GetCookie(const std::string& name, const std::string& defaultValue) const {
    const auto found = m_pContext->cookies.find(name);
    return found == m_pContext->cookies.end() ? defaultValue : found->second;
}

bool APIRequest::IsAuthorized() const {
    return m_pContext->login.has_value();
}

bool APIRequest::IsAdmin() const {
    return m_pContext->login && m_pContext->login->is_manager;
}

bool APIRequest::HasAppPriv(const std::string& application) const {
    return m_pContext->login && application == lookhaven::binding::kApplication;
}

APIResponse::APIResponse(Context& context) : m_pContext(&context) {}

void APIResponse::SetSuccess(const Json::Value& data) {
    m_pContext->answer = lookhaven::binding::SuccessText(data);
}

void APIResponse::SetError(int code, const Json::Value& data) {
    std::string& text = m_pContext->answer.emplace(R"({"error":{"code":)" + std::to_string(code) + R"(,"data":)");
    lookhaven::binding::AppendCompactJson(text, data);
    text += R"(},"success":false})";
}

void APIResponse::SetEnableOutput(bool enable) {
    m_pContext->output_enabled = enable;
}

}  // namespace VEXO
