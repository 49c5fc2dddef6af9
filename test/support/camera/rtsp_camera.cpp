// SPDX-License-Identifier: Apache-2.0
//
// A simulated RTSP camera: H.264 and AAC at rtsp://127.0.0.1:<port>/live, for any number of clients, and other codecs
// under the other paths.
//
//   rtsp-camera <port>     0 takes a free one; the port is printed when the camera is ready
//
// SIGUSR1 stops the picture while the sound continues; SIGUSR2 resumes it. SIGWINCH doubles its width and height.
// SIGSTOP makes the camera stall, SIGKILL makes it vanish. It ends with its parent.
#include <csignal>
#include <cstdio>
#include <string>
#include <vector>

#include <glib-unix.h>
#include <gst/rtsp-server/rtsp-server.h>
#include <sys/prctl.h>

namespace {

constexpr const char* kPicture =
    "videotestsrc is-live=true pattern=ball "
    "! capsfilter name=form caps=video/x-raw,format=I420,width=320,height=240,framerate=25/1 ! valve name=picture ! ";
constexpr const char* kH264 = "x264enc tune=zerolatency speed-preset=ultrafast key-int-max=25 bitrate=300 "
                              "! rtph264pay name=pay0 pt=96 config-interval=-1 ";
constexpr const char* kH265 = "x265enc tune=zerolatency speed-preset=ultrafast key-int-max=25 bitrate=300 "
                              "! rtph265pay name=pay0 pt=96 config-interval=-1 ";

struct Mount {
    const char* path;
    const char* video;
    const char* audio;  // what follows the raw sound; empty: no sound
};

constexpr Mount kMounts[] = {
    {"/live", kH264, "audio/x-raw,rate=16000,channels=1 ! avenc_aac bitrate=32000 ! rtpmp4gpay name=pay1 pt=97"},
    {"/h264-pcmu", kH264, "audio/x-raw,rate=8000,channels=1 ! mulawenc ! rtppcmupay name=pay1 pt=0"},
    {"/h265-pcma", kH265, "audio/x-raw,rate=8000,channels=1 ! alawenc ! rtppcmapay name=pay1 pt=8"},
    {"/h265-opus", kH265, "audio/x-raw,rate=48000,channels=1 ! opusenc ! rtpopuspay name=pay1 pt=97"},
    {"/h265-aac", kH265, "audio/x-raw,rate=48000,channels=2 ! avenc_aac ! rtpmp4gpay name=pay1 pt=97"},
    {"/h264", kH264, ""},
};

bool g_withheld = false;
std::vector<GstElement*> g_valves;  // of all clients
std::vector<GstElement*> g_forms;

void Withhold(bool on) {
    g_withheld = on;
    for (GstElement* valve : g_valves) {
        g_object_set(valve, "drop", on ? TRUE : FALSE, nullptr);
    }
}

void EnlargePicture() {
    GstCaps* caps = gst_caps_from_string("video/x-raw,format=I420,width=640,height=480,framerate=25/1");
    for (GstElement* form : g_forms) {
        g_object_set(form, "caps", caps, nullptr);
    }
    gst_caps_unref(caps);
}

void OnMedia(GstRTSPMediaFactory*, GstRTSPMedia* media, gpointer) {
    GstElement* pipeline = gst_rtsp_media_get_element(media);
    g_valves.push_back(gst_bin_get_by_name(GST_BIN(pipeline), "picture"));
    g_forms.push_back(gst_bin_get_by_name(GST_BIN(pipeline), "form"));
    gst_object_unref(pipeline);
    Withhold(g_withheld);
}

}  // namespace

int main(int argc, char** argv) {
    prctl(PR_SET_PDEATHSIG, SIGKILL);
    gst_init(&argc, &argv);
    GMainLoop* loop = g_main_loop_new(nullptr, FALSE);
    GstRTSPServer* server = gst_rtsp_server_new();
    gst_rtsp_server_set_address(server, "127.0.0.1");
    gst_rtsp_server_set_service(server, argc > 1 ? argv[1] : "0");
    GstRTSPMountPoints* mounts = gst_rtsp_server_get_mount_points(server);
    for (const Mount& mount : kMounts) {
        const std::string sound =
            *mount.audio == '\0' ? "" : "audiotestsrc is-live=true wave=ticks ! " + std::string(mount.audio);
        const std::string pipeline = std::string("( ") + kPicture + mount.video + sound + " )";
        GstRTSPMediaFactory* factory = gst_rtsp_media_factory_new();
        gst_rtsp_media_factory_set_launch(factory, pipeline.c_str());
        g_signal_connect(factory, "media-configure", G_CALLBACK(OnMedia), nullptr);
        gst_rtsp_mount_points_add_factory(mounts, mount.path, factory);
    }
    g_object_unref(mounts);
    if (gst_rtsp_server_attach(server, nullptr) == 0) {
        std::fprintf(stderr, "rtsp-camera: cannot listen\n");
        return 1;
    }
    g_unix_signal_add(
        SIGUSR1, [](gpointer) -> gboolean { return Withhold(true), TRUE; }, nullptr);
    g_unix_signal_add(
        SIGUSR2, [](gpointer) -> gboolean { return Withhold(false), TRUE; }, nullptr);
    g_unix_signal_add(
        SIGWINCH, [](gpointer) -> gboolean { return EnlargePicture(), TRUE; }, nullptr);
    std::printf("%d\n", gst_rtsp_server_get_bound_port(server));
    std::fflush(stdout);
    g_main_loop_run(loop);
}
