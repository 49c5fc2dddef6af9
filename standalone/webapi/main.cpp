// SPDX-License-Identifier: Apache-2.0
//
// lookhaven-webapi: hosts web API modules behind a web server that speaks SCGI.
#include <cstdlib>
#include <filesystem>
#include <iostream>
#include <string>
#include <vector>

#include <CLI/CLI.hpp>
#include <sysexits.h>

#include "standalone/api/decoder_sandbox.h"
#include "standalone/api/modules.h"
#include "standalone/api/read_call.h"
#include "standalone/api/serve.h"
#include "standalone/api/session_filter.h"
#include "standalone/api/session_watcher.h"
#include "standalone/base/installation.h"
#include "standalone/base/log.h"
#include "standalone/base/process.h"
#include "standalone/base/state_folder.h"
#include "standalone/host/listener.h"
#include "standalone/host/server.h"

namespace base = lookhaven::base;
namespace api = lookhaven::api;
namespace host = lookhaven::host;
namespace http = lookhaven::http;
namespace control = lookhaven::control;

namespace {

struct Options {
    std::string home;
    std::string socket;
    std::vector<std::string> modules;
    host::ServerLimits limits;
    api::RequestLimits requests;
};

void AddMillis(CLI::App& app, const char* name, std::chrono::milliseconds& value, const char* text) {
    app.add_option_function<double>(
           name,
           [&value](const double& seconds) {
               value = std::chrono::milliseconds(static_cast<std::int64_t>(seconds * 1000));
           },
           text)
        ->check(CLI::Range(0.01, 3600.0));
}

void Describe(CLI::App& app, Options& options) {
    app.add_option("--home", options.home, "state folder (default: " + base::DefaultHome().string() + ")");
    app.add_option("--socket", options.socket, "unix socket to listen on (run/webapi.sock in the state folder)");
    app.add_option("--module", options.modules, "web API module to serve; may be given several times");
    app.add_option("--max-requests", options.limits.requests, "requests running at once")->check(CLI::Range(1, 4096));
    app.add_option("--max-requests-per-user", options.requests.per_user, "of them, of one account")
        ->check(CLI::Range(1, 4096));
    app.add_option("--max-searches-per-user", options.requests.searches_per_user,
                   "of an account's, searches; more wait")
        ->check(CLI::Range(1, 4096));
    app.add_option("--spare-processes", options.limits.spare_processes, "processes that wait for a request each")
        ->check(CLI::Range(0, 64));
    AddMillis(app, "--read-seconds", options.limits.read, "for a request to arrive");
    AddMillis(app, "--answer-seconds", options.limits.processes.answer, "for a request that is not a stream");
    AddMillis(app, "--leave-seconds", options.limits.processes.leave, "for a process that was told to end");
}

// A part of the requests is kept for log-ins, and another for managers: whatever viewers do, an owner gets in.
void ReserveSlots(Options& options) {
    const std::size_t requests = options.limits.requests;
    options.limits.kept_for_log_in = requests / 32;
    options.requests.without_managers = requests - requests / 32 - requests / 16;
}

void Run(const Options& options) {
    const base::Installation installation =
        options.home.empty() ? base::Installation::FromEnvironment() : base::Installation(options.home);
    api::Modules modules;
    for (const std::string& module : options.modules) {
        modules.Load(module);
    }
    api::PrepareToServe(installation);
    base::RaiseDescriptorLimit();  // each running request costs the host two
    host::Listener listener(options.socket.empty() ? installation.WebApiSocket()
                                                   : std::filesystem::path(options.socket));
    http::RequestCounters counters;
    const api::Service service{installation, modules, options.requests, api::PlaybackFilter(installation.StoreUrl()),
                               counters};
    api::SessionFilter filter;
    const host::Callbacks callbacks{
        .serve_request =
            [&](http::Request& request, control::SlotTable& slots, control::Slot& slot) {
                filter.Close();
                api::ServeRequest(service, request, slots, slot);
            },
        .prepare_process = [&] { api::PrepareProcess(installation); },
        .needs_fork = [](const http::Request& request) { return api::NeedsCounters(request); },
        .watch_sessions = [&](control::SlotTable& slots) { api::WatchSessions(installation, slots, filter); },
        .is_log_in = api::MayBeLogIn,
        .refuse_unread = [&](const http::Request& request) -> std::optional<http::Failure> {
            if (filter.MayHaveSession(request)) {
                return std::nullopt;
            }
            return api::SessionNeeded(api::MayBeLogIn(request));
        }};
    host::Server server(installation, callbacks, listener, counters, options.limits);
    base::LogInfo("serving on " + listener.Name());
    server.Run();
}

}  // namespace

int main(int count, char** arguments) {
    host::OpenStandardDescriptors();
    base::SetLogProgram("webapi");
    Options options;
    CLI::App app("Hosts web API modules behind a web server that speaks SCGI.");
    Describe(app, options);
    CLI11_PARSE(app, count, arguments);
    ReserveSlots(options);
    try {
        Run(options);
    } catch (const std::exception& error) {
        base::LogError(error.what());
        return EX_UNAVAILABLE;
    }
    return EXIT_SUCCESS;
}
