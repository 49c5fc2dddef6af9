// SPDX-License-Identifier: Apache-2.0
//
// Test double of the platform's request, admission, privileges and log; construction and destruction of the script.
#include "test/support/platform/scripted_platform.h"

#include <algorithm>
#include <cstdarg>
#include <cstdio>
#include <cstring>
#include <stdexcept>

#include <unistd.h>

#include "platform/admission/host.h"
#include "platform/admission/pairauth.h"
#include "platform/log/lhprintf.h"
#include "platform/privilege/privprofile.h"
#include "test/support/platform/record.h"

DbgLogCfg* g_pDbgLogCfg = nullptr;
int g_DbgLogPid = 0;

struct VEXO::APIRequest::Context {};
struct VEXO::APIResponse::Context {};
struct PrivProfile::Data {
    int id;
    int privilege;
    std::set<int> denied, muted, denied_groups;
    ~Data() {
        if (lookhaven::test::CurrentPlatform() != nullptr && lookhaven::test::Script().watched_mutex != nullptr) {
            lookhaven::test::Script().Record("free profile");
        }
    }
};

namespace lookhaven::test {
namespace {

ScriptedPlatform* current = nullptr;

}  // namespace

Calls operator+(Calls left, const Calls& right) {
    left.insert(left.end(), right.begin(), right.end());
    return left;
}

ScriptedPlatform* CurrentPlatform() {
    return current;
}

ScriptedPlatform::ScriptedPlatform() {
    pthread_mutexattr_t attributes;
    pthread_mutexattr_init(&attributes);
    pthread_mutexattr_setrobust(&attributes, PTHREAD_MUTEX_ROBUST);
    pthread_mutexattr_settype(&attributes, PTHREAD_MUTEX_ERRORCHECK);
    pthread_mutex_init(&common_cfg.m_Mutex, &attributes);
    pthread_mutexattr_destroy(&attributes);
    common_cfg.m_Timestamp = monotonic_now;
    common_cfg.m_blPause = 0;
    g_pDbgLogCfg = &log_cfg;
    g_DbgLogPid = 0;
    current = this;
}

ScriptedPlatform::~ScriptedPlatform() {
    current = nullptr;
    g_pDbgLogCfg = nullptr;
    for (const int signal : {SIGINT, SIGQUIT, SIGTERM, SIGPIPE, SIGUSR1, SIGUSR2}) {
        std::signal(signal, SIG_DFL);
    }
    pthread_mutex_destroy(&common_cfg.m_Mutex);
}

void ScriptedPlatform::Record(const std::string& call) {
    if (calls.size() == 10000) {
        throw std::runtime_error("the script does not end");
    }
    calls.push_back(call);
    if (on_call) {
        on_call(call);
    }
    if (const auto planned = at.find(call); planned != at.end()) {
        planned->second(*this);
    }
}

VEXO::APIRequest* ScriptedPlatform::Request() {
    static VEXO::APIRequest::Context context;
    static VEXO::APIRequest request(context);
    return &request;
}

VEXO::APIResponse* ScriptedPlatform::Response() {
    static VEXO::APIResponse::Context context;
    static VEXO::APIResponse response(context);
    return &response;
}

Calls ScriptedPlatform::CallsFrom(const std::string& text) const {
    const auto begins = [&](const auto& call) { return call.starts_with(text); };
    return {std::find_if(calls.begin(), calls.end(), begins), calls.end()};
}

Calls ScriptedPlatform::CallsOf(const std::string& text) const {
    Calls found;
    std::copy_if(calls.begin(), calls.end(), std::back_inserter(found),
                 [&](const auto& call) { return call.rfind(text, 0) == 0; });
    return found;
}

std::string Text(const Json::Value& value) {
    Json::StreamWriterBuilder builder;
    builder["indentation"] = "";
    return Json::writeString(builder, value);
}

StdoutCapture::StdoutCapture() : saved_(dup(STDOUT_FILENO)), file_(std::tmpfile()) {
    std::fflush(nullptr);
    dup2(fileno(file_), STDOUT_FILENO);
}

StdoutCapture::~StdoutCapture() {
    std::fflush(nullptr);
    dup2(saved_, STDOUT_FILENO);
    close(saved_);
    std::fclose(file_);
}

std::string StdoutCapture::Text() {
    std::fflush(nullptr);
    std::string text(4096, '\0');
    text.resize(static_cast<std::size_t>(pread(fileno(file_), text.data(), text.size(), 0)));
    return text;
}

}  // namespace lookhaven::test

using lookhaven::test::Call;
using lookhaven::test::Script;
using lookhaven::test::Text;

namespace VEXO {

APIRequest::APIRequest(Context& context) : m_pContext(&context) {}
Json::Value APIRequest::GetParam(const std::string& name, const Json::Value& defaultValue) const {
    Call("GetParam", name, Text(defaultValue));
    const auto found = Script().params.find(name);
    if (found != Script().params.end()) {
        return found->second;
    }
    // As the framework does, turns a text that is a number into one, a default too.
    const bool is_number = defaultValue.isString() && !defaultValue.asString().empty() &&
                           defaultValue.asString().find_first_not_of("-0123456789") == std::string::npos;
    return is_number ? Json::Value(std::stoi(defaultValue.asString())) : defaultValue;
}
std::string APIRequest::GetAPIMethod() const {
    return Call("GetAPIMethod"), Script().method;
}
unsigned int APIRequest::GetLoginUID() const {
    return Call("GetLoginUID"), Script().login_uid;
}
std::string APIRequest::GetLoginUserName() const {
    return Call("GetLoginUserName"), Script().user_name;
}
std::string APIRequest::GetSessionID() const {
    return Call("GetSessionID"), Script().session_id;
}
std::string APIRequest::GetRemoteIP() const {
    return Call("GetRemoteIP"), "192.0.2.9";
}
std::string APIRequest::GetCookie(const std::string& name, const std::string& defaultValue) const {
    Call("GetCookie", name, defaultValue);
    const auto found = Script().cookies.find(name);
    return found == Script().cookies.end() ? defaultValue : found->second;
}
bool APIRequest::IsAuthorized() const {
    return Call("IsAuthorized"), Script().is_authorized;
}
bool APIRequest::IsAdmin() const {
    return Call("IsAdmin"), Script().is_admin;
}
bool APIRequest::HasAppPriv(const std::string& application) const {
    return Call("HasAppPriv", application), Script().has_app_priv;
}

APIResponse::APIResponse(Context& context) : m_pContext(&context) {}
void APIResponse::SetSuccess(const Json::Value& data) {
    Call("SetSuccess", Text(data));
}
void APIResponse::SetError(int code, const Json::Value& data) {
    Call("SetError", code, Text(data));
}
void APIResponse::SetEnableOutput(bool enable) {
    Call("SetEnableOutput", enable);
}

}  // namespace VEXO

bool IsCmsHost() {
    return Call("IsCmsHost"), Script().is_cms_host;
}
bool IsLHRunning() {
    return Call("IsLHRunning"), Script().is_running;
}
int GetCamOwnerHxId(int camId) {
    return Call("GetCamOwnerHxId", camId), Script().owner_host;
}
void LHTaskSet::SetAffinity(const std::string& taskSet) {
    Call("SetAffinity", taskSet);
}
bool SDKUser::AppPrivUserHas(const std::string& userName, const std::string& application, const std::string& remoteIp) {
    return Call("AppPrivUserHas", userName, application, remoteIp), Script().has_user_priv;
}
bool IsAuthPairMatch(const std::string& cookie, const std::string& timestamp) {
    return Call("IsAuthPairMatch", cookie, timestamp), Script().pair_matches;
}
SlaveHxAuthentication::SlaveHxAuthentication() {
    Call("SlaveHxAuthentication");
}
bool SlaveHxAuthentication::IsAuthByPairMatch(const std::string& cookie, const std::string& timestamp) {
    return Call("IsAuthByPairMatch", cookie, timestamp), Script().pair_matches;
}

PrivProfile::PrivProfile() = default;
PrivProfile::PrivProfile(std::shared_ptr<const Data> data) : m_pData(std::move(data)) {}
int PrivProfile::GetId() const {
    return m_pData ? m_pData->id : 0;
}
int PrivProfile::GetPrivilege() const {
    return m_pData->privilege;
}
std::set<int> PrivProfile::GetInaCamIdSet(CAM_PRIV_TYPE type, bool withHidden) const {
    return Call("GetInaCamIdSet", type, withHidden), type == CAM_PRIV_AUDIO ? m_pData->muted : m_pData->denied;
}
std::set<int> PrivProfile::GetInaPrivPerCamGrpIdSet(int type) const {
    return Call("GetInaPrivPerCamGrpIdSet", type), m_pData->denied_groups;
}
std::set<int> PrivProfile::GetInaEmapIdSet(ITEM_PRIV_TYPE type, bool withHidden) const {
    return Call("GetInaEmapIdSet", type, withHidden), Script().denied_emaps;
}
std::set<int> PrivProfile::GetInaIOIdSet(bool withHidden) const {
    return Call("GetInaIOIdSet", withHidden), Script().denied_modules;
}
bool IsDoorPrivAllowed(const PrivProfile& profile, DOOR_PRIV_TYPE type, int doorId) {
    Call("IsDoorPrivAllowed", type, doorId, profile.GetPrivilege());
    return Script().denied_doors.count(doorId) == 0;
}
void PrivProfile::UpdateByJson(const Json::Value& privData) {
    Call("UpdateByJson", Text(privData));
    auto narrowed = std::make_shared<Data>(*m_pData);
    narrowed->privilege = privData.get("privilege", narrowed->privilege).asInt();
    m_pData = narrowed;
}
PrivProfile PrivProfileGetByUid(unsigned int uid) {
    Call("PrivProfileGetByUid", uid);
    return PrivProfile(std::shared_ptr<const PrivProfile::Data>(
        new PrivProfile::Data{Script().profile_id, Script().privilege, Script().denied_cameras, Script().muted_cameras,
                              Script().denied_groups}));
}

void LHPrintf(LOG_TYPE, const char* categName, const char* levelName, const char* file, int line, const char* func,
              const char* fmt, ...) {
    char text[512];
    va_list arguments;
    va_start(arguments, fmt);
    std::vsnprintf(text, sizeof text, fmt, arguments);
    va_end(arguments);
    const auto name = [](const char* value) { return value == nullptr ? "null" : value; };
    const std::string gate = categName == nullptr ? "" : std::string(categName) + "/" + name(levelName) + " ";
    Script().logs.push_back({name(categName), name(levelName), file, line, func, text});
    Script().Record("log " + gate + text);
}
template <>
LHEnum2StrMap<LOG_CATEG>::LHEnum2StrMap() : m_Names{{LOG_CATEG(32), "live"}, {LOG_CATEG(68), "player"}} {}
// Level 3 has no name.
template <>
LHEnum2StrMap<LOG_LEVEL>::LHEnum2StrMap()
    : m_Names{{LOG_LEVEL(1), "1"}, {LOG_LEVEL(4), "4"}, {LOG_LEVEL(5), "5"}, {LOG_LEVEL(6), "6"}} {}
