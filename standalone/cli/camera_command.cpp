// SPDX-License-Identifier: Apache-2.0
//
// lookhaven camera: adds, lists, changes, removes and probes cameras.
#include <chrono>
#include <cstdio>

#include "standalone/base/host_name.h"
#include "standalone/cli/camera_options.h"
#include "standalone/cli/camera_state.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/recording_options.h"
#include "standalone/cli/table.h"
#include "standalone/cli/units.h"
#include "standalone/media/probe.h"
#include "standalone/pattern/pattern_source.h"
#include "standalone/store/devices.h"
#include "standalone/store/text.h"
#include "standalone/store/transaction.h"

namespace lookhaven::cli {

namespace {

using store::Camera;
using store::Cameras;
using store::RecordingPlan;
using store::RecordingPlans;

constexpr std::chrono::seconds kProbeTimeout{10};

struct Request {
    int id = 0;
    std::string target;  // of a probe: an id or an address
    bool insecure = false;
    std::optional<std::string> account;
    store::PortCounts ports;
    CameraOptions options;
    RecordingOptions recording;
};

Json::Value ToData(const Camera& camera, const RecordingPlan& plan) {
    Json::Value data =
        Object("id", camera.id, "name", camera.name, "enabled", camera.enabled, "video_type",
               static_cast<int>(camera.video_type), "live_profile", camera.live_profile, "ptz", camera.ptz, "audio",
               camera.audio, "insecure", camera.insecure, "recording", PlanData(plan));
    for (const store::CameraProfile& profile : camera.profiles) {
        data["profiles"].append(Object("number", profile.number, "source", profile.source, "width", profile.width,
                                       "height", profile.height, "fps", profile.fps));
    }
    return data;
}

std::string FeaturesText(const Json::Value& camera) {
    return std::string(camera["ptz"].asBool() ? "PTZ " : "") + (camera["audio"].asBool() ? "audio " : "") +
           (camera["insecure"].asBool() ? "insecure" : "");
}

std::string LiveSourceText(const Json::Value& camera) {
    for (const Json::Value& profile : camera["profiles"]) {
        if (profile["number"] == camera["live_profile"]) {
            return profile["source"].asString();
        }
    }
    return "none";
}

constexpr Column kColumns[] = {{"id", "id"},
                               {"name", "name"},
                               {"state", "", CameraStateText},
                               {"video", "video_type", VideoTypeText},
                               {"features", "", FeaturesText},
                               {"recorded", "recording.mode"},
                               {"live source", "", LiveSourceText}};

Camera RequireCamera(Cameras& cameras, int id) {
    return Require(cameras.Find(id), "there is no camera ", id, ": see lookhaven camera list");
}

void RequireSource(const std::string& source) {
    const media::SourceKinds kinds = pattern::AllSourceKinds();
    if (media::FindKind(kinds, source) == nullptr || !store::IsSource(source)) {
        throw Failure(kDataError, "a source begins with ", media::ListKinds(kinds),
                      " and contains no account or password: give the account with --account");
    }
    const std::size_t host = source.find("://");
    if (host != source.npos &&
        !base::IsHostAndPort(source.substr(host + 3, source.find_first_of("/?#", host + 3) - host - 3))) {
        throw Failure(kDataError, "the source ", source, " names no valid host or port");
    }
}

void RequireSources(const Camera& camera) {
    for (const store::CameraProfile& profile : camera.profiles) {
        RequireSource(profile.source);
    }
}

media::ProbeResult Probe(const std::string& source, bool insecure,
                         const std::optional<store::Credentials>& credentials) {
    RequireSource(source);
    media::SourceOptions options{{}, kProbeTimeout, insecure};
    if (credentials) {
        options.credentials = {credentials->account, credentials->password};
    }
    return media::ProbeSource(pattern::AllSourceKinds(), source, options);
}

// None without an account, and for an empty one, which removes the stored one.
std::optional<store::Credentials> AskCredentials(const Request& request) {
    if (!request.account || request.account->empty()) {
        return std::nullopt;
    }
    return store::Credentials{*request.account, ReadPassword(*request.account, false)};
}

// Fills in what the options leave open. A source whose address tells its codec is not opened.
void ProbeMissing(Camera& camera, const Request& request, const std::optional<store::Credentials>& credentials) {
    const store::CameraProfile* live = camera.FindProfile(camera.live_profile);
    if (request.options.HasType() || live == nullptr) {
        return;
    }
    const std::string& source = live->source;
    if (source.starts_with("http")) {
        camera.video_type = base::Codec::kMjpeg;
        return;
    }
    const media::ProbeResult found = Probe(source, camera.insecure, credentials);
    if (!base::IsVideo(found.video.codec)) {
        throw Failure(kDataError, "the source sends ", base::CodecName(found.video.codec),
                      ", but only MJPEG, H.264 and H.265 are supported");
    }
    camera.video_type = found.video.codec;
    if (!request.options.HasAudio()) {
        camera.audio = found.audio.has_value();
    }
}

void SetPlan(store::Store& store, int id, const Request& request, const RecordingPlan& plan) {
    if (request.recording.IsGiven()) {
        RecordingPlans(store).Set(id, plan);
    }
}

void Add(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Cameras cameras(store);
    Camera camera;
    request.options.ApplyTo(camera);
    RequireSources(camera);
    const std::optional<store::Credentials> credentials = AskCredentials(request);
    ProbeMissing(camera, request, credentials);
    RecordingPlan plan;
    request.recording.ApplyTo(plan);
    store::InTransaction(store, [&] {
        camera.id = cameras.Add(camera);
        if (credentials) {
            cameras.SetCredentials(camera.id, credentials);
        }
        SetPlan(store, camera.id, request, plan);
    });
    console.Answer(ToData(camera, plan), "Added camera ", camera.name, " with id ", camera.id, "; it sends ",
                   VideoTypeName(camera.video_type), ".");
}

void Change(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Cameras cameras(store);
    Camera camera = RequireCamera(cameras, request.id);
    const Camera before = camera;
    request.options.ApplyTo(camera);
    RequireSources(camera);
    const std::optional<store::Credentials> credentials = AskCredentials(request);
    const bool has_new_source =
        camera.live_profile != before.live_profile || request.options.HasSource(camera.live_profile);
    if (has_new_source || credentials) {
        ProbeMissing(camera, request, request.account ? credentials : cameras.FindCredentials(camera.id));
    }
    if (!has_new_source && !request.options.HasAudio()) {
        camera.audio = before.audio;  // the owner's choice
    }
    RecordingPlan plan = RecordingPlans(store).Find(camera.id);
    request.recording.ApplyTo(plan);
    store::InTransaction(store, [&] {
        SetPlan(store, camera.id, request, plan);
        cameras.Update(camera);
        if (request.account) {
            cameras.SetCredentials(camera.id, credentials);
        }
    });
    console.Answer(ToData(camera, plan), "Changed camera ", camera.id, ".");
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    const std::map<int, RecordingPlan> plans = RecordingPlans(store).List();
    const CameraStates states(console.Installation());
    Json::Value data = Json::arrayValue;
    for (const Camera& camera : Cameras(store).List()) {
        const auto plan = plans.find(camera.id);
        states.AddTo(data.append(ToData(camera, plan == plans.end() ? RecordingPlan() : plan->second)));
    }
    console.Answer(data, Table(kColumns, data));
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Cameras(store).Remove(request.id);
    console.Answer(Object("id", request.id), "Removed camera ", request.id, "; its recordings are kept.");
}

void SetPorts(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    const auto [inputs, outputs] = request.ports;
    store::Devices(store).SetCameraPorts(request.id, request.ports);
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
    const auto [video, frames_per_second, audio] = ProbeTarget(console, request);
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

    Command add = group.Add("add", "Adds a camera; --name and --source are required", Add);
    request.options.AddTo(add);
    request.recording.AddTo(add);
    add.Option("--account", request.account, account).Require("--name").Require("--source");

    Command set = group.Add("set", "Changes the given properties of a camera", Change);
    set.Option("id", request.id, id, Required);
    request.options.AddTo(set);
    request.recording.AddTo(set);
    set.Option("--account", request.account, account + "; empty for none");

    group.Add("list", "Lists the cameras", List);
    group.Add("remove", "Removes a camera", Remove).Option("id", request.id, id, Required);
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
