// SPDX-License-Identifier: Apache-2.0
#include "standalone/api/serve.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdio>
#include <new>

#include <sys/resource.h>
#include <sys/socket.h>
#include <sys/uio.h>
#include <unistd.h>

#include "standalone/admin/change.h"
#include "standalone/api/bearer.h"
#include "standalone/api/decoder_sandbox.h"
#include "standalone/api/emap_setup.h"
#include "standalone/api/forward.h"
#include "standalone/api/forward_target.h"
#include "standalone/api/own_apis.h"
#include "standalone/api/player.h"
#include "standalone/api/read_call.h"
#include "standalone/base/concat.h"
#include "standalone/base/json_text.h"
#include "standalone/base/log.h"
#include "standalone/base/sanitizers.h"
#include "standalone/binding/rights.h"
#include "standalone/http/body.h"
#include "standalone/store/engine.h"
#include "standalone/store/servers.h"
#include "standalone/store/store.h"

namespace lookhaven::api {

namespace {

constexpr rlim_t kMaxAddressSpace = rlim_t{256} << 20;
constexpr rlim_t kMaxAddressSpaceForPictures = rlim_t{1} << 30;
constexpr const char* kStoreFailed = "the record store cannot be read; the server's log says why";
constexpr const char* kStoreUnavailable = "the record store is not available; the server's log says why";

// Not under a sanitizer, which maps terabytes before main.
void LimitAddressSpace(rlim_t max_bytes) {
    rlimit limit{};
    if (!base::kSanitized && ::getrlimit(RLIMIT_AS, &limit) == 0) {
        limit.rlim_cur = std::min(max_bytes, limit.rlim_max);
        ::setrlimit(RLIMIT_AS, &limit);
    }
}

int PortIn(std::string_view text) {
    int port = 0;
    std::from_chars(text.data(), text.data() + text.size(), port);
    return port;
}

binding::TcpConnection ConnectionOf(const http::Request& request) {
    return {std::string(request.Header("SERVER_ADDR")), PortIn(request.Header("SERVER_PORT")),
            std::string(request.Header("PEER_ADDR")), PortIn(request.Header("PEER_PORT"))};
}

// What decodes a picture must not find its sender's secret: others look at what it makes.
void ForgetCookies(http::Request& request, Call& call) {
    if (const auto header = request.headers.find("HTTP_COOKIE"); header != request.headers.end()) {
        http::Wipe(header->second);
    }
    for (auto& [name, value] : call.cookies) {
        http::Wipe(value);
    }
}

// Sends head and body without joining them: the list of a month's events has megabytes.
void SendJson(binding::Output& output, std::string& body) {
    std::string head = http::JsonHead(200, body.size());
    std::array<iovec, 2> pieces{{{head.data(), head.size()}, {body.data(), body.size()}}};
    output.Send(pieces);
}

// Runs the module's entry function; empty when the answer has been sent.
std::string RunModule(EntryFunction entry, const Call& call) {
    VEXO::APIRequest::Context asked{call.parameters, call.cookies, call.method,
                                    std::string(call.request.Header("REMOTE_ADDR")), call.login};
    if (asked.login && call.context.RequestRestrictions().privilege > store::Privilege::kManager) {
        asked.login->is_manager = false;
    }
    VEXO::APIRequest request(asked);
    VEXO::APIResponse::Context given;
    VEXO::APIResponse response(given);
    entry(&request, &response);
    std::fflush(stdout);
    if (call.context.output()->BytesSent() > 0) {
        return "";
    }
    switch (call.context.WorstStoreFailure()) {
    case binding::RequestContext::StoreFailure::kNone:
        break;
    case binding::RequestContext::StoreFailure::kUnavailable:
        throw Failure(503, kStoreUnavailable, http::kRetrySoonSeconds);
    case binding::RequestContext::StoreFailure::kFailed:
        throw Failure(500, kStoreFailed);
    }
    if (given.answer && given.output_enabled) {
        SendJson(*call.context.output(), *given.answer);
        return "";
    }
    if (call.context.WantsPicture()) {
        throw Failure(504, "no picture came");
    }
    if (!call.login) {
        throw Failure(401, "no session");
    }
    throw Failure(502, "the handler gave no answer");
}

// Throws Failure for what this method does not take, and for who may not use it.
const Method& RequireMethod(const OwnApi& api, const Call& call) {
    const Method& method = api.Find(call.version, call.method);
    control::SlotTable::SetCall(call.slot, call.api + '/' + call.method);
    if (method.accepts == Method::Accepts::kPostOnly && call.request.Header("REQUEST_METHOD") != "POST") {
        throw Failure(405, "this method takes POST only");
    }
    if (method.audience == Method::Audience::kManagers && !binding::IsManager()) {
        throw Failure(403, kManagersOnly);
    }
    return method;
}

// The store's refusals of a change become failures that the caller is told.
std::string RunMethod(const Method& method, const Call& call) {
    try {
        return method.serve(call);
    } catch (const store::InvalidRecord& error) {
        throw Failure(400, error.what());
    } catch (const store::NotFound& error) {
        throw Failure(404, error.what());
    } catch (const store::Conflict& error) {
        throw Failure(409, error.what());
    } catch (const admin::Stale& error) {
        throw Failure(409, error.what(), 0, base::OneLineJson(error.Record()));
    } catch (const admin::StillNeeded& error) {
        throw Failure(409, error.what());
    } catch (const admin::Forbidden& error) {
        throw Failure(403, error.what());
    }
}

std::string Serve(const Service& service, http::Request& request, control::SlotTable& slots, control::Slot& slot) {
    if (const std::string_view method = request.Header("REQUEST_METHOD"); method != "GET" && method != "POST") {
        throw Failure(405, "GET and POST only");
    }
    Call call = ReadCall(service.installation, service.counters, request, slots, slot);
    if (call.token) {
        RequireReport(call);
    }
    const OwnApi* own = FindOwnApi(call.api);
    const EntryFunction entry = own == nullptr ? service.modules.Find(call.api, call.version, call.method) : nullptr;
    if (own == nullptr && entry == nullptr) {
        throw Failure(404, "no such api, version or method");
    }
    control::SlotTable::SetCall(slot, entry != nullptr ? call.api + '/' + call.method : call.api);
    if (CostClassOf(call) == CostClass::kPictures) {
        LimitAddressSpace(kMaxAddressSpaceForPictures);
    }
    const bool needs_session = own == nullptr || own->needs_session ||
                               own->Find(call.version, call.method).audience == Method::Audience::kManagers;
    if (needs_session) {
        Admit(call, service.limits);
    } else if (own == &kHostApi) {
        AdmitHost(slots, slot, RequireHost(call), service.limits);
    }
    if (IsPictureUpload(call)) {
        ForgetCookies(request, call);
    }
    const Method* method = own == nullptr ? nullptr : &RequireMethod(*own, call);
    if (ForwardIfNeeded(call)) {
        return "";
    }
    if (method != nullptr) {
        return RunMethod(*method, call);
    }
    if (call.login && IsPlayer(call)) {
        PreparePlayer(call);
    }
    if (IsPlayer(call)) {
        EnterPlaybackSandbox(service.installation, service.playback_filter);
    }
    return RunModule(entry, call);
}

std::string ServeOrFail(const Service& service, http::Request& request, control::SlotTable& slots,
                        control::Slot& slot) {
    const auto fail = [&](const Failure& failure) {
        slot.status = failure.Status();
        return http::FailureAnswer(failure, LinesForForwarder(request));
    };
    try {
        slot.status = 200;
        return Serve(service, request, slots, slot);
    } catch (const Failure& failure) {
        return fail(failure);
    } catch (const Json::Exception&) {
        return fail(Failure(400, "a parameter has the wrong type"));
    } catch (const std::bad_alloc&) {
        return fail(Failure(500, "the answer needs too much memory; ask for less at once"));
    } catch (const store::StoreUnavailable& error) {
        base::LogError(std::string("the request failed: ") + error.what());
        return fail(Failure(503, kStoreUnavailable, http::kRetrySoonSeconds));
    } catch (const store::StoreError& error) {
        base::LogError(std::string("the request failed: ") + error.what());
        return fail(Failure(500, kStoreFailed));
    } catch (const std::exception& error) {
        base::LogError(std::string("the request failed: ") + error.what());
    } catch (...) {
        base::LogError("the request failed: an exception of unknown type");
    }
    return fail(Failure(500, "the handler failed unexpectedly"));
}

}  // namespace

void PrepareToServe(const base::Installation& installation) try {
    store::PrepareEngine(installation.StoreUrl());
    SuccessAnswer(Json::Value(Json::objectValue));  // binds what writes answers
} catch (const std::exception&) {
    // Opening the store fails likewise.
}

void PrepareProcess(const base::Installation& installation) try {
    binding::RequestContext::Current().OpenRecordsAhead(installation);
} catch (const std::exception&) {
    // The request fails likewise.
}

bool MayBeLogIn(const http::Request& request) {
    return request.Header("REQUEST_METHOD") == "POST" &&
           request.Header("QUERY_STRING").find(base::Concat("api=", kAuthApi.name)) != std::string_view::npos;
}

bool NeedsCounters(const http::Request& request) {
    return request.Header("QUERY_STRING").find("Metrics") != std::string_view::npos;
}

void ServeRequest(const Service& service, http::Request& request, control::SlotTable& slots, control::Slot& slot) {
    binding::Output output(STDOUT_FILENO, {}, [&slot] { return slot.MustEnd() || slot.player.is_excess; });
    LimitAddressSpace(kMaxAddressSpace);
    slot.pid = ::getpid();
    binding::RequestEvents events;
    events.on_stream = [&slot] {
        slot.is_stream = true;
        LimitAddressSpace(RLIM_INFINITY);
    };
    events.on_player = [&slots, &slot](std::int64_t key) {
        slots.BeginPlayer(slot, key);
        slots.KeepOnly(slot);  // from here on it reads what a camera sent
    };
    events.on_paired_host = [&service, &slots, &slot](const std::string& secret) {
        slot.pairing = store::PairingId(secret);
        AdmitPairedHost(slots, slot, service.limits);
    };
    binding::RequestContext& context = binding::RequestContext::Current();
    context.Begin(service.installation, &output, std::move(events));
    binding::SendQueue queue(STDOUT_FILENO, ConnectionOf(request));
    context.SetQueue(&queue);
    const std::string answer = ServeOrFail(service, request, slots, slot);
    std::fflush(stdout);
    // What was written before an exception cannot be taken back, and nothing may follow it.
    if (output.BytesSent() == 0) {
        std::fwrite(answer.data(), 1, answer.size(), stdout);
        std::fflush(stdout);
    }
    // The host has the connection open too; the client should not wait for it.
    ::shutdown(STDOUT_FILENO, SHUT_WR);
    http::DropBody(request, STDOUT_FILENO);
}

}  // namespace lookhaven::api
