// SPDX-License-Identifier: Apache-2.0
//
// lookhaven camera: adds, lists, changes, removes and probes cameras.
#include <cstdio>

#include "standalone/admin/camera_stream.h"
#include "standalone/admin/cameras.h"
#include "standalone/admin/devices.h"
#include "standalone/admin/hosts.h"
#include "standalone/base/codec_words.h"
#include "standalone/cli/camera_data.h"
#include "standalone/cli/camera_options.h"
#include "standalone/cli/camera_state.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/recording_hours.h"
#include "standalone/cli/recording_options.h"
#include "standalone/cli/retention_text.h"
#include "standalone/cli/units.h"
#include "standalone/pattern/pattern_source.h"
#include "standalone/store/devices.h"

namespace lookhaven::cli {

namespace {

using store::Camera;
using store::Cameras;
using store::RecordingPlan;
using store::RecordingPlans;

struct Request {
    int id = 0;
    std::string target;  // of a probe: an id or an address
    bool insecure = false;
    std::optional<std::string> account;
    std::optional<std::string> host;
    std::vector<std::string> hours;
    bool deletes_footage = false;
    bool yes = false;
    store::PortCounts ports;
    CameraOptions options;
    RecordingOptions recording;
};

Camera RequireCamera(Cameras& cameras, int id) {
    return Require(cameras.Find(id), "there is no camera ", id, ": see lookhaven camera list");
}

void RequireSource(const std::string& source) try {
    admin::RequireSource(pattern::AllSourceKinds(), source);
} catch (const store::InvalidRecord& error) {
    const std::string_view sentence = error.what();
    throw Failure(kDataError, sentence, sentence.ends_with("password") ? ": give the account with --account" : "");
}

void RequireSources(const Camera& camera) {
    for (const store::CameraProfile& profile : camera.profiles) {
        RequireSource(profile.source);
    }
}

media::ProbeResult OpenAndProbe(const std::string& source, const media::SourceOptions& options) {
    return media::ProbeSource(pattern::AllSourceKinds(), source, options);
}

media::ProbeResult Probe(const std::string& source, bool insecure,
                         const std::optional<store::Credentials>& credentials) {
    return admin::ProbeStream(OpenAndProbe, pattern::AllSourceKinds(), source, insecure, credentials);
}

// Asks for the password; nothing without an account, and for an empty one, which removes the stored credentials.
std::optional<store::Credentials> AskCredentials(const Request& request) {
    if (!request.account || request.account->empty()) {
        return std::nullopt;
    }
    return store::Credentials{*request.account, ReadPassword(*request.account, false)};
}

// Fills in what the options leave open.
void ProbeMissing(admin::CameraSetup& setup, const Request& request) {
    if (!request.options.HasType()) {
        admin::FillInFromStream(setup, request.options.HasAudio(), OpenAndProbe, pattern::AllSourceKinds());
    }
}

void ApplyPlan(admin::CameraSetup& setup, const Request& request) {
    if (request.recording.IsGiven()) {
        RecordingPlan plan = setup.plan.value_or(RecordingPlan());
        request.recording.ApplyTo(plan);
        setup.plan = plan;
    }
}

void ApplyHost(store::Store& store, Camera& camera, const Request& request) {
    if (request.host) {
        camera.host_id = admin::HostNamed(store, *request.host);
    }
}

void Add(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    admin::CameraSetup setup;
    request.options.ApplyTo(setup.camera);
    ApplyHost(store, setup.camera, request);
    RequireSources(setup.camera);
    setup = admin::AddCamera(store, {}, pattern::AllSourceKinds(), setup, [&](admin::CameraSetup& camera) {
        camera.credentials = AskCredentials(request);
        ProbeMissing(camera, request);
        ApplyPlan(camera, request);
    });
    console.Answer(CameraData(setup.camera, setup.plan.value_or(store::NoPlan())), "Added camera ", setup.camera.name,
                   " with id ", setup.camera.id, "; it sends ", base::CodecTitle(setup.camera.video_type), ".");
}

void Edit(admin::CameraSetup& setup, const Request& request) {
    Camera& camera = setup.camera;
    const Camera before = camera;
    request.options.ApplyTo(camera);
    RequireSources(camera);
    if (request.account) {
        setup.credentials = AskCredentials(request);
    }
    const bool has_new_source =
        camera.live_profile != before.live_profile || request.options.HasSource(camera.live_profile);
    if (has_new_source || (request.account && setup.credentials)) {
        ProbeMissing(setup, request);
    }
    if (!has_new_source && !request.options.HasAudio()) {
        camera.audio = before.audio;  // the operator's choice
    }
    ApplyPlan(setup, request);
}

void Change(const Console& console, const Request& request) try {
    store::Store store = console.OpenStore();
    Cameras cameras(store);
    RequireCamera(cameras, request.id);
    const admin::CameraSetup setup = admin::SetCamera(
        store, {}, pattern::AllSourceKinds(), request.id, std::nullopt,
        [&](admin::CameraSetup& camera) {
            ApplyHost(store, camera.camera, request);
            Edit(camera, request);
        },
        request.yes);
    console.Answer(CameraData(setup.camera, setup.plan.value_or(store::NoPlan())), "Changed camera ", request.id, ".");
} catch (const admin::DeletesRecordings& refusal) {
    AskToConfirm(refusal);
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    const std::map<int, RecordingPlan> plans = RecordingPlans(store).List();
    const CameraStates states(console.Installation());
    Json::Value data = Json::arrayValue;
    for (const Camera& camera : Cameras(store).List()) {
        const auto plan = plans.find(camera.id);
        states.AddTo(data.append(CameraData(camera, plan == plans.end() ? store::NoPlan() : plan->second)));
    }
    console.Answer(data, CameraTable(data));
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    admin::RemoveCamera(store, {}, request.id, std::nullopt,
                        request.deletes_footage ? admin::Footage::kRemove : admin::Footage::kKeep);
    console.Answer(Object("id", request.id), "Removed camera ", request.id,
                   request.deletes_footage ? "; the recorder deletes its recordings." : "; its recordings are kept.");
}

void Plan(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Cameras cameras(store);
    RequireCamera(cameras, request.id);
    admin::CameraSetup setup = admin::ReadCamera(store, request.id);
    if (!request.hours.empty()) {
        setup = admin::SetCamera(store, {}, pattern::AllSourceKinds(), request.id, std::nullopt,
                                 [&request](admin::CameraSetup& camera) {
                                     RecordingPlan plan = camera.plan.value_or(RecordingPlan());
                                     plan.mode = store::RecordMode::kSchedule;
                                     plan.hours = HoursOf(plan);
                                     for (const std::string& span : request.hours) {
                                         SetHours(plan.hours, span);
                                     }
                                     camera.plan = plan;
                                 });
    }
    const Json::Value plan = PlanData(setup.plan.value_or(store::NoPlan()));
    console.Answer(plan, "Recorded: ", plan["mode"].asString(), "\n",
                   plan["mode"] == "schedule" ? HoursText(plan["hours"].asString()) : "");
}

void SetPorts(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const auto [inputs, outputs] = request.ports;
    admin::SetCameraPorts(store, {}, request.id, request.ports);
    console.Answer(Object("id", request.id, "inputs", inputs, "outputs", outputs), "Camera ", request.id, " has ",
                   inputs, " inputs and ", outputs, " outputs.");
}

media::ProbeResult ProbeTarget(const Console& console, const Request& request) {
    const std::optional<int> id = ParseNumber<int>(request.target);
    if (!id) {
        RequireSource(request.target);  // before a password is asked for
        return Probe(request.target, request.insecure, AskCredentials(request));
    }
    store::Store store = console.OpenStore();
    Cameras cameras(store);
    const Camera camera = RequireCamera(cameras, *id);
    const store::CameraProfile* live = camera.FindProfile(camera.live_profile);
    return Probe(live == nullptr ? "" : live->source, camera.insecure || request.insecure,
                 request.account ? AskCredentials(request) : cameras.FindCredentials(*id));
}

void ShowProbe(const Console& console, const Request& request) {
    const auto [video, frames_per_second, audio, key_frame] = ProbeTarget(console, request);
    const char* codec = base::CodecName(video.codec);
    char fps[32];
    std::snprintf(fps, sizeof fps, "%.1f", frames_per_second);
    std::string text =
        Concat("Video: ", codec, " ", video.width, "x", video.height, ", ", fps, " frames per second\nAudio: ");
    Json::Value data;
    data["video"] = Object("codec", codec, "width", video.width, "height", video.height, "fps", frames_per_second);
    if (audio) {
        codec = base::CodecName(audio->codec);
        data["audio"] = Object("codec", codec, "sample_rate", audio->sample_rate_hz, "channels", audio->channels);
        text += Concat(codec, ", ", audio->sample_rate_hz, " Hz, ", audio->channels, " channels");
    } else {
        text += "none";
    }
    console.Answer(data, text);
}

}  // namespace

void AddCamera(CLI::App& program, const Console& console) {
    CommandGroup<Request> group(program, console, "camera", "Cameras and their sources");
    Request& request = group.request();
    const std::string id = "The camera's id";
    const std::string account = "The camera's account; prompts for its password";
    const std::string host = "The host of lookhaven host that alone records it; any for whichever has room";

    Command add = group.Add("add", "Adds a camera; --name and --source are required", Add);
    request.options.AddTo(add);
    request.recording.AddTo(add);
    add.Option("--account", request.account, account)
        .Option("--host", request.host, host)
        .Require("--name")
        .Require("--source");

    Command set = group.Add("set", "Changes the given properties of a camera", Change);
    set.Option("id", request.id, id, Required);
    request.options.AddTo(set);
    request.recording.AddTo(set);
    set.Option("--account", request.account, account + "; empty for none")
        .Option("--host", request.host, host)
        .Flag("--yes", request.yes, "Also where a lower age deletes recordings");

    group.Add("list", "Lists the cameras", List);
    group.Add("remove", "Removes a camera", Remove)
        .Option("id", request.id, id, Required)
        .Flag("--delete-footage", request.deletes_footage, "Also deletes its recordings, except kept ones");
    group.Add("plan", "Shows or sets in which hours of the week a camera is recorded", Plan)
        .Option("id", request.id, id, Required)
        .Option("hours", request.hours, "Such as \"mon-fri 8-18 always\" \"sat-sun alarm\"; later ones win");
    group.Add("ports", "Sets the number of a camera's digital inputs and outputs", SetPorts)
        .Option("id", request.id, id, Required)
        .Option("--inputs", request.ports.inputs, "Number of inputs (default: 0)")
        .Option("--outputs", request.ports.outputs, "Number of outputs (default: 0)");
    group.Add("probe", "Opens a source and shows what it sends", ShowProbe)
        .Option("target", request.target, "A camera's id, or an address", Required)
        .Option("--account", request.account, account)
        .Flag("--insecure", request.insecure, "Takes any HTTPS certificate");
}

}  // namespace lookhaven::cli
