// SPDX-License-Identifier: Apache-2.0
//
// lookhaven camera: adds, lists, changes, removes and tries cameras.
#include <algorithm>
#include <charconv>
#include <chrono>
#include <cstdio>
#include <memory>

#include "standalone/cli/camera_options.h"
#include "standalone/cli/commands.h"
#include "standalone/cli/recording_options.h"
#include "standalone/media/probe.h"
#include "standalone/pattern/pattern_source.h"
#include "standalone/store/devices.h"
#include "standalone/store/text.h"

namespace lookhaven::cli {

namespace {

using store::Camera;
using store::Cameras;
using store::RecordingPlan;
using store::RecordingPlans;

constexpr std::chrono::seconds kProbeLimit{10};

struct Request {
    int id = 0;
    std::string target;  // of a probe: an id or an address
    std::optional<std::string> account;
    store::PortCounts ports;
    CameraOptions options;
    RecordingOptions recording;
};

Json::Value ToData(const Camera& camera, const RecordingPlan& plan) {
    Json::Value data;
    data["id"] = camera.id;
    data["name"] = camera.name;
    data["enabled"] = camera.enabled;
    data["video_type"] = static_cast<int>(camera.video_type);
    data["live_profile"] = camera.live_profile;
    data["ptz"] = camera.ptz;
    data["audio"] = camera.audio;
    for (const store::CameraProfile& profile : camera.profiles) {
        Json::Value entry;
        entry["number"] = profile.number;
        entry["source"] = profile.source;
        entry["width"] = profile.width;
        entry["height"] = profile.height;
        entry["fps"] = profile.fps;
        data["profiles"].append(entry);
    }
    data["recording"] = PlanData(plan);
    return data;
}

Camera Require(Cameras& cameras, int id) {
    const std::optional<Camera> camera = cameras.Find(id);
    if (!camera) {
        throw Failure(kNoInput, "there is no camera " + std::to_string(id) + ": lookhaven camera list names them");
    }
    return *camera;
}

void RequireSource(const std::string& source) {
    const media::SourceKinds kinds = pattern::AllSourceKinds();
    if (media::FindKind(kinds, source) == nullptr || !store::IsSource(source)) {
        throw Failure(kDataError, "a source begins with " + media::ListKinds(kinds) +
                                      " and holds no account or password: name the account with --account");
    }
}

void RequireSources(const Camera& camera) {
    for (const store::CameraProfile& profile : camera.profiles) {
        RequireSource(profile.source);
    }
}

media::ProbeResult Probe(const std::string& source, const std::optional<store::Credentials>& credentials) {
    RequireSource(source);
    media::Credentials login;
    if (credentials) {
        login = {credentials->account, credentials->password};
    }
    return media::ProbeSource(pattern::AllSourceKinds(), source, login, kProbeLimit);
}

// An empty account takes the stored one away; no account at all leaves it.
std::optional<store::Credentials> AskCredentials(const Request& request) {
    if (!request.account || request.account->empty()) {
        return std::nullopt;
    }
    return store::Credentials{*request.account, ReadPassword(*request.account, false)};
}

// Fills in what the options leave open. Only sources that tell nothing by their address are opened for it.
void FindOut(Camera& camera, const Request& request, const std::optional<store::Credentials>& credentials) {
    const store::CameraProfile* live = camera.FindProfile(camera.live_profile);
    if (request.options.HasType() || live == nullptr) {
        return;
    }
    const std::string& source = live->source;
    if (source.starts_with("http")) {
        camera.video_type = base::Codec::kMjpeg;
        return;
    }
    const media::ProbeResult found = Probe(source, credentials);
    if (!base::IsVideo(found.video.codec)) {
        throw Failure(kDataError, std::string("the source sends ") + base::CodecName(found.video.codec) +
                                      ", which is none of MJPEG, H.264 and H.265");
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
    FindOut(camera, request, credentials);
    RecordingPlan plan;
    request.recording.ApplyTo(plan);
    camera.id = cameras.Add(camera);
    if (credentials) {
        cameras.SetCredentials(camera.id, credentials);
    }
    SetPlan(store, camera.id, request, plan);
    console.Answer("The camera " + camera.name + " has the id " + std::to_string(camera.id) + " and sends " +
                       VideoTypeName(camera.video_type) + ".",
                   ToData(camera, plan));
}

void Change(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Cameras cameras(store);
    Camera camera = Require(cameras, request.id);
    const store::CameraProfile before = *camera.FindProfile(camera.live_profile);
    request.options.ApplyTo(camera);
    RequireSources(camera);
    const std::optional<store::Credentials> credentials = AskCredentials(request);
    const store::CameraProfile* live = camera.FindProfile(camera.live_profile);
    if (live != nullptr && live->source != before.source) {
        FindOut(camera, request, request.account ? credentials : cameras.FindCredentials(camera.id));
    }
    RecordingPlan plan = RecordingPlans(store).Find(camera.id);
    request.recording.ApplyTo(plan);
    SetPlan(store, camera.id, request, plan);
    cameras.Update(camera);
    if (request.account) {
        cameras.SetCredentials(camera.id, credentials);
    }
    console.Answer("The camera " + std::to_string(camera.id) + " is changed.", ToData(camera, plan));
}

void List(const Console& console) {
    store::Store store = console.OpenStore();
    Json::Value data = Json::arrayValue;
    Rows rows = {{"id", "name", "state", "video", "can", "recorded", "live source"}};
    const std::map<int, RecordingPlan> plans = RecordingPlans(store).List();
    for (const Camera& camera : Cameras(store).List()) {
        const auto found = plans.find(camera.id);
        const RecordingPlan plan = found == plans.end() ? RecordingPlan() : found->second;
        data.append(ToData(camera, plan));
        const std::string can = std::string(camera.ptz ? "move " : "") + (camera.audio ? "hear" : "");
        const store::CameraProfile* live = camera.FindProfile(camera.live_profile);
        rows.push_back({std::to_string(camera.id), camera.name, camera.enabled ? "enabled" : "disabled",
                        VideoTypeName(camera.video_type), can,
                        plan.mode == store::RecordMode::kAlways ? "always" : "never",
                        live == nullptr ? "none" : live->source});
    }
    console.Answer(Table(rows), data);
}

void Remove(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    Cameras(store).Remove(request.id);
    Json::Value data;
    data["id"] = request.id;
    console.Answer("The camera " + std::to_string(request.id) + " is gone; its recordings stay.", data);
}

void SetPorts(const Console& console, const Request& request) {
    store::Store store = console.OpenStore();
    store::Devices(store).SetCameraPorts(request.id, request.ports);
    Json::Value data;
    data["id"] = request.id;
    data["inputs"] = request.ports.inputs;
    data["outputs"] = request.ports.outputs;
    console.Answer("The camera " + std::to_string(request.id) + " has " + std::to_string(request.ports.inputs) +
                       " inputs and " + std::to_string(request.ports.outputs) + " outputs.",
                   data);
}

std::optional<int> AsId(const std::string& text) {
    int id = 0;
    const char* end = text.data() + text.size();
    const auto [rest, error] = std::from_chars(text.data(), end, id);
    return error == std::errc() && rest == end ? std::optional(id) : std::nullopt;
}

media::ProbeResult ProbeTarget(const Console& console, const Request& request) {
    const std::optional<int> id = AsId(request.target);
    if (!id) {
        RequireSource(request.target);  // before a password is asked for
        return Probe(request.target, AskCredentials(request));
    }
    store::Store store = console.OpenStore();
    Cameras cameras(store);
    const Camera camera = Require(cameras, *id);
    const store::CameraProfile* live = camera.FindProfile(camera.live_profile);
    return Probe(live == nullptr ? "" : live->source,
                 request.account ? AskCredentials(request) : cameras.FindCredentials(*id));
}

void ShowProbe(const Console& console, const Request& request) {
    const media::ProbeResult found = ProbeTarget(console, request);
    Json::Value data;
    data["video"]["codec"] = base::CodecName(found.video.codec);
    data["video"]["width"] = found.video.width;
    data["video"]["height"] = found.video.height;
    data["video"]["fps"] = found.frames_per_second;
    char fps[32];
    std::snprintf(fps, sizeof fps, "%.1f", found.frames_per_second);
    std::string text = std::string("Video: ") + base::CodecName(found.video.codec) + " " +
                       std::to_string(found.video.width) + "x" + std::to_string(found.video.height) + ", " + fps +
                       " frames per second\n";
    if (found.audio) {
        data["audio"]["codec"] = base::CodecName(found.audio->codec);
        data["audio"]["sample_rate"] = found.audio->sample_rate_hz;
        data["audio"]["channels"] = found.audio->channels;
        text += std::string("Audio: ") + base::CodecName(found.audio->codec) + ", " +
                std::to_string(found.audio->sample_rate_hz) + " Hz, " + std::to_string(found.audio->channels) +
                " channels\n";
    } else {
        text += "Audio: none\n";
    }
    console.Answer(text, data);
}

}  // namespace

void AddCamera(CLI::App& program, Console& console) {
    CLI::App* group = program.add_subcommand("camera", "Cameras and their sources")->require_subcommand(1);
    auto request = std::make_shared<Request>();
    const auto command = [&](const char* name, const char* purpose, void (*run)(const Console&, const Request&)) {
        CLI::App* added = group->add_subcommand(name, purpose);
        added->callback([&console, request, run] { run(console, *request); });
        return added;
    };
    const auto add_account = [&](CLI::App* to, const char* purpose) {
        to->add_option("--account", request->account, purpose);
    };

    CLI::App* add = command("add", "Adds a camera", Add);
    request->options.AddTo(*add);
    request->recording.AddTo(*add);
    add->get_option("--name")->required();
    add->get_option("--source")->required();
    add_account(add, "The camera's account; its password is asked for");

    CLI::App* set = command("set", "Changes what is given and leaves the rest", Change);
    set->add_option("id", request->id, "The camera's id")->required();
    request->options.AddTo(*set);
    request->recording.AddTo(*set);
    add_account(set, "The camera's account, whose password is asked for; empty for none");

    group->add_subcommand("list", "Lists the cameras")->callback([&console] { List(console); });
    command("remove", "Removes a camera", Remove)->add_option("id", request->id, "The camera's id")->required();

    CLI::App* ports = command("ports", "Says how many digital inputs and outputs a camera has", SetPorts);
    ports->add_option("id", request->id, "The camera's id")->required();
    ports->add_option("--inputs", request->ports.inputs, "How many inputs (else none)");
    ports->add_option("--outputs", request->ports.outputs, "How many outputs (else none)");

    CLI::App* probe = command("probe", "Opens a source and says what it sends", ShowProbe);
    probe->add_option("target", request->target, "A camera's id, or an address")->required();
    add_account(probe, "The camera's account; its password is asked for");
}

}  // namespace lookhaven::cli
