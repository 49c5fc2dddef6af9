// SPDX-License-Identifier: Apache-2.0
#include "standalone/webapi/request_process.h"

#include <algorithm>
#include <csignal>
#include <cstdio>
#include <iterator>

#include <sys/prctl.h>
#include <sys/resource.h>
#include <sys/socket.h>
#include <unistd.h>

#include "standalone/base/log.h"
#include "standalone/binding/request.h"
#include "standalone/binding/request_context.h"
#include "standalone/binding/rights.h"
#include "standalone/webapi/answer.h"
#include "standalone/webapi/auth.h"
#include "standalone/webapi/catalog.h"
#include "standalone/webapi/emap.h"
#include "standalone/webapi/event.h"
#include "standalone/webapi/parameters.h"
#include "standalone/webapi/picture.h"
#include "standalone/webapi/playback.h"
#include "standalone/webapi/relay.h"

namespace lookhaven::webapi {

namespace {

using binding::RequestContext;

constexpr int kWakeDescriptor = 3;
constexpr rlim_t kMaxAddressSpace = rlim_t{1} << 30;

// Under a sanitizer a process maps terabytes before main.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kLimitAddressSpace = false;
#else
constexpr bool kLimitAddressSpace = true;
#endif

void LimitAddressSpace(bool limited) {
    rlimit limit{};
    if (kLimitAddressSpace && ::getrlimit(RLIMIT_AS, &limit) == 0) {
        limit.rlim_cur = limited && kMaxAddressSpace < limit.rlim_max ? kMaxAddressSpace : limit.rlim_max;
        ::setrlimit(RLIMIT_AS, &limit);
    }
}

// Another site's page can make a browser send a POST; the browser says so.
bool IsCrossSite(const ScgiRequest& request) {
    if (const std::string_view site = request.Header("HTTP_SEC_FETCH_SITE"); !site.empty()) {
        return site != "same-origin" && site != "none";
    }
    std::string_view origin = request.Header("HTTP_ORIGIN");
    if (origin.empty()) {
        return false;
    }
    const std::size_t scheme_end = origin.find("://");
    return scheme_end == origin.npos || origin.substr(scheme_end + 3) != request.Header("HTTP_HOST");
}

// Runs the module's function; returns the host's answer, empty when the client has one already.
std::string RunEntry(EntryFunction entry, VEXO::APIRequest::Context& asked) {
    const RequestContext& context = RequestContext::Current();
    VEXO::APIRequest request(asked);
    VEXO::APIResponse::Context given;
    VEXO::APIResponse response(given);
    entry(&request, &response);
    std::fflush(stdout);
    if (context.output()->BytesSent() > 0) {
        return "";
    }
    if (given.answer && given.output_enabled) {
        return JsonAnswer(200, *given.answer);
    }
    if (context.WantsPicture()) {
        throw Failure(504, "no picture came");
    }
    if (!asked.login) {
        throw Failure(401, "no session");
    }
    throw Failure(502, "the handler gave no answer");
}

// An API that the host itself serves to sessions.
struct OwnApi {
    const char* api;
    std::string (*serve)(const RequestTask& task, const ScgiRequest& request, int version,
                         const VEXO::APIRequest::Context& asked);
};

const OwnApi kOwnApis[] = {
    {kPictureApi,
     [](const RequestTask&, const ScgiRequest&, int version, const VEXO::APIRequest::Context& asked) {
         return ServePicture(RequestContext::Current(), version, asked.method, asked.parameters);
     }},
    {kPlaybackApi,
     [](const RequestTask& task, const ScgiRequest& request, int version, const VEXO::APIRequest::Context& asked) {
         return ServePlayback(RequestContext::Current(), task.slots, request, version, asked.method, asked.parameters);
     }},
    {kEventApi,
     [](const RequestTask&, const ScgiRequest& request, int version, const VEXO::APIRequest::Context& asked) {
         return ServeEvent(RequestContext::Current(), request, version, asked.method, asked.parameters);
     }},
    {kCatalogApi,
     [](const RequestTask&, const ScgiRequest&, int version, const VEXO::APIRequest::Context& asked) {
         return ServeCatalog(RequestContext::Current(), version, asked.method);
     }},
    {kRelayApi,
     [](const RequestTask&, const ScgiRequest&, int version, const VEXO::APIRequest::Context& asked) {
         return ServeRelay(RequestContext::Current(), version, asked.method, asked.parameters);
     }},
    {kEmapApi,
     [](const RequestTask&, const ScgiRequest& request, int version, const VEXO::APIRequest::Context& asked) {
         return ServeEmap(RequestContext::Current(), request, version, asked.method, asked.parameters);
     }},
};

// Takes in who calls; a caller without a session may only go on where the API admits by itself.
void Admit(const RequestTask& task, const ScgiRequest& request, const std::string& api,
           VEXO::APIRequest::Context& asked) {
    RequestContext& context = RequestContext::Current();
    asked.cookies = ReadCookies(request);
    asked.remote_ip = request.Header("REMOTE_ADDR");
    asked.login = FindLogin(context, asked.cookies);
    const Json::Value renounced = Find(asked.parameters, "privData");
    context.Renounce(binding::CamerasDeniedBy(renounced), binding::SoundDeniedBy(renounced));
    if (!asked.login) {
        if (api != kSelfAdmittingApi) {
            throw Failure(401, "no session");
        }
        return;
    }
    context.SetCaller(asked.login->user_id);
    context.SetSession(asked.login->session_handle);
    SlotTable::SetSession(task.slot, asked.login->session_handle);
    if (task.slots.OlderOfSession(task.slot) >= task.max_requests_per_session) {
        throw Failure(503, "too many requests of this session are running");
    }
    if (IsPlayer(api, asked.method)) {
        PreparePlayer(task.slot.player, context.Records(), asked.method, asked.parameters);
    }
}

std::string Serve(const RequestTask& task, const ScgiRequest& request) {
    RequestContext& context = RequestContext::Current();
    if (request.Header("REQUEST_METHOD") != "GET" && request.Header("REQUEST_METHOD") != "POST") {
        throw Failure(405, "GET and POST only");
    }
    if (request.Header("REQUEST_METHOD") == "POST" && IsCrossSite(request)) {
        throw Failure(403, "another site's page may not ask for this");
    }
    VEXO::APIRequest::Context asked;
    asked.parameters = ReadParameters(request);
    asked.method = Find(asked.parameters, "method").asString();
    const std::string api = Find(asked.parameters, "api").asString();
    const int version = Find(asked.parameters, "version").asInt();
    if (api == kAuthApi) {
        return ServeAuth(context, task.slots, request, version, asked.method, asked.parameters);
    }
    const EntryFunction entry = task.modules.Find(api, version, asked.method);
    const auto* own =
        std::find_if(std::begin(kOwnApis), std::end(kOwnApis), [&api](const OwnApi& each) { return api == each.api; });
    if (entry == nullptr && own == std::end(kOwnApis)) {
        throw Failure(404, "no such api, version or method");
    }
    Admit(task, request, api, asked);
    return entry == nullptr ? own->serve(task, request, version, asked) : RunEntry(entry, asked);
}

std::string ServeOrFail(const RequestTask& task, const ScgiRequest& request) {
    try {
        return Serve(task, request);
    } catch (const Failure& failure) {
        return FailureAnswer(failure);
    } catch (const Json::Exception&) {
        return FailureAnswer(Failure(400, "a parameter has the wrong type"));
    } catch (const std::exception& error) {
        base::LogError(std::string("the request failed: ") + error.what());
    } catch (...) {
        base::LogError("the request failed: an exception of unknown type");
    }
    return FailureAnswer(Failure(500, "the handler failed unexpectedly"));
}

}  // namespace

void LeaveHost(pid_t host, SlotTable& slots, int standard_output) {
    ::prctl(PR_SET_PDEATHSIG, SIGKILL);
    if (::getppid() != host) {
        _exit(1);  // the host died before it could take us along
    }
    if (standard_output >= 0) {
        ::dup2(standard_output, STDOUT_FILENO);
    }
    ::dup2(slots.WakeDescriptor(), kWakeDescriptor);
    slots.SetWakeDescriptor(kWakeDescriptor);
    ::close_range(kWakeDescriptor + 1, ~0U, 0);
    for (int number = 1; number < NSIG; ++number) {
        std::signal(number, SIG_DFL);
    }
    for (const int number : {SIGPIPE, SIGINT, SIGQUIT, SIGHUP, SIGUSR1, SIGUSR2}) {
        std::signal(number, SIG_IGN);
    }
    sigset_t none;
    sigemptyset(&none);
    ::sigprocmask(SIG_SETMASK, &none, nullptr);
}

void RunRequest(const RequestTask& task, const ScgiRequest& request) {
    binding::Output output(STDOUT_FILENO, {}, [&task] { return task.slot.has_ended || task.slot.player.is_surplus; });
    LimitAddressSpace(true);
    task.slot.pid = ::getpid();
    binding::RequestEvents events;
    events.on_stream = [&task] {
        task.slot.is_stream = true;
        LimitAddressSpace(false);
    };
    events.on_player = [&task](std::int64_t key) { task.slots.BeginPlayer(task.slot, key); };
    RequestContext::Current().Begin(task.installation, &output, std::move(events));
    const std::string answer = ServeOrFail(task, request);
    std::fflush(stdout);
    // What was written before an exception cannot be taken back, and nothing may stand behind it.
    if (output.BytesSent() == 0) {
        std::fwrite(answer.data(), 1, answer.size(), stdout);
        std::fflush(stdout);
    }
    // The host has the connection open too; the client should not wait for it.
    ::shutdown(STDOUT_FILENO, SHUT_WR);
    _exit(0);
}

}  // namespace lookhaven::webapi
