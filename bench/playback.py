# SPDX-License-Identifier: Apache-2.0
"""Playback of recorded events: frames a second and processor time beside ffmpeg, the first picture, and the pace.

An hour of 25 pictures a second, as Motion JPEG of 640x360 and as H.264 of 1280x720 with a key frame every two seconds, is put
on the mount and imported as a recorder's would be. Prints four Markdown tables.
"""

import dataclasses
import http.client
import os
import pathlib
import resource
import statistics
import subprocess
import sys
import tempfile
import time

from stand import Stand, busy, cpu_nanos

FPS = 25
HOUR = 3600
CLIP_SECONDS = 60
FRAMES = 1500
STEP_FRAMES = 12  # as the client asks for
START = 1_772_366_400
CODECS = {
    "MJPEG": ["-s", "640x360", "-c:v", "mjpeg", "-q:v", "5", "-pix_fmt", "yuvj420p"],
    "H.264": ["-s", "1280x720", "-c:v", "libx264", "-preset", "veryfast", "-g", str(2 * FPS), "-bf", "0", "-pix_fmt", "yuv420p"]
    + ["-x264-params", "repeat-headers=1"],  # as in every recording of ours
}
# What ffmpeg does for the same pictures.
RIVALS = {"MJPEG": ["-c", "copy"], "H.264": ["-c:v", "mjpeg", "-q:v", "3", "-threads", "1"]}


def children_micros():
    """Processor time of all children that have ended."""
    usage = resource.getrusage(resource.RUSAGE_CHILDREN)
    return (usage.ru_utime + usage.ru_stime) * 1e6


def ffmpeg(*arguments):
    subprocess.run(["ffmpeg", "-v", "error", "-nostdin", "-y", *map(str, arguments)], check=True)


@dataclasses.dataclass
class Recorded:
    event: int
    file: pathlib.Path


def record_hour(stand, camera, codec):
    """An hour on the mount, without an index or a row: what verify imports, under an id of its own."""
    day = time.strftime("%Y-%m-%d", time.gmtime(START))
    folder = stand.mount / str(camera) / day
    folder.mkdir(parents=True)
    file = folder / f"{time.strftime('%H%M%S', time.gmtime(START))}-{9_000 + camera}.mkv"
    with tempfile.TemporaryDirectory() as clips:
        clip = pathlib.Path(clips) / "clip.mkv"
        ffmpeg("-f", "lavfi", "-i", f"testsrc2=size=1280x720:rate={FPS}:duration={CLIP_SECONDS}", *CODECS[codec], clip)
        ffmpeg("-stream_loop", HOUR // CLIP_SECONDS - 1, "-i", clip, "-c", "copy", "-cluster_time_limit", 1000, file)
    os.utime(file, (START, START))  # what is fresh might still be written


class Player:
    """One stream of the host, read part by part."""

    def __init__(self, stand, cookie, **parameters):
        query = {"api": "VEXO.Lookhaven.Player", "version": 1, "method": "PlayMjpegEvent", "timestamp": 1, **parameters}
        self._connection = http.client.HTTPConnection("127.0.0.1", stand.port, timeout=60)
        self._connection.request(
            "GET", "/webapi?" + "&".join(f"{name}={value}" for name, value in query.items()), headers={"Cookie": f"id={cookie}"}
        )
        self.response = self._connection.getresponse()
        if "multipart" not in self.response.headers.get("Content-Type", ""):
            raise RuntimeError(f"no stream: {self.response.status} {self.response.headers}")

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.response.close()
        self._connection.close()

    def next_picture(self):
        """The picture's bytes; the number before it is passed over."""
        while True:
            length, kind = 0, b""
            while (line := self.response.readline()) != b"\r\n" or not length:
                if not line:
                    raise EOFError("the stream ended")
                name, _, value = line.partition(b":")
                length = int(value) if name.lower() == b"content-length" else length
                kind = value.strip() if name.lower() == b"content-type" else kind
            body = self.response.read(length)
            if kind == b"image/jpeg":
                return body


def print_speed(stand, cookie, recorded):
    print("| recording | by | frames/s | CPU µs a frame | of ffmpeg's |")
    print("|---|---|---|---|---|")
    for codec, one in recorded.items():
        rival = ["ffmpeg", "-v", "error", "-nostdin", "-i", one.file, "-an", *RIVALS[codec]]
        began, before = time.monotonic(), children_micros()
        subprocess.run([*rival, "-frames:v", str(FRAMES), "-f", "mpjpeg", "-"], stdout=subprocess.DEVNULL, check=True)
        took, theirs = time.monotonic() - began, (children_micros() - before) / FRAMES
        print(f"| {codec} | ffmpeg to a pipe | {FRAMES / took:.0f} | {theirs:.0f} | 1.00 |", flush=True)
        # Every frame as fast as it goes, with its number before it.
        with Player(stand, cookie, eventid=one.event, interval=0, framestop=HOUR * FPS - 1) as player:
            player.next_picture()
            process = busy(stand.processes("webapi"))
            began, before = time.monotonic(), cpu_nanos(process)
            for _ in range(FRAMES):
                player.next_picture()
            took, used = time.monotonic() - began, cpu_nanos(process) - before
        ours = used / 1000 / FRAMES
        print(f"| {codec} | host behind nginx | {FRAMES / took:.0f} | {ours:.0f} | {ours / theirs:.2f} |", flush=True)


def print_first_pictures(stand, cookie, recorded):
    print("| recording | first picture at | p50 ms | longest ms |")
    print("|---|---|---|---|")
    for codec, one in recorded.items():
        # Late in a group of pictures, which a decoder has to go through.
        for name, frame in (("its start", 0), ("its middle", HOUR * FPS // 2 + 49), ("its end", HOUR * FPS - 51 + 49)):
            times = []
            for _ in range(20):
                began = time.monotonic()
                with Player(stand, cookie, eventid=one.event, framestart=frame) as player:
                    player.next_picture()
                    times.append((time.monotonic() - began) * 1000)
            print(f"| {codec} | {name} | {statistics.median(times):.1f} | {max(times):.1f} |", flush=True)


def print_steps_back(stand, cookie, recorded):
    """A group of pictures from its end to its beginning, with a request a step, and with one for STEP_FRAMES."""
    print("| recording | a step back by | p50 ms a request | mean ms a step |")
    print("|---|---|---|---|")
    last = HOUR * FPS // 2 + 49
    for codec, one in recorded.items():
        for name, frames in (("a request of its own", 1), (f"a request for {STEP_FRAMES} frames", STEP_FRAMES)):
            times = []
            for stop in range(last, last - 48, -frames):
                began = time.monotonic()
                start = {"framestart": stop - frames + 1, "framestop": stop, "interval": 0}
                with Player(stand, cookie, eventid=one.event, **start) as player:
                    for _ in range(frames):
                        player.next_picture()
                times.append((time.monotonic() - began) * 1000)
            print(
                f"| {codec} | {name} | {statistics.median(times):.1f} | {statistics.mean(times) / frames:.1f} |", flush=True
            )


def print_pace(stand, cookie, recorded):
    print("| recording | played for | pictures | off by |")
    print("|---|---|---|---|")
    for codec, one in recorded.items():
        with Player(stand, cookie, eventid=one.event) as player:
            player.next_picture()
            began, pictures = time.monotonic(), 0
            while time.monotonic() - began < 60:
                player.next_picture()
                pictures += 1
            took = time.monotonic() - began
        print(f"| {codec} | {took:.1f} s | {pictures} | {pictures / FPS - took:+.3f} s |", flush=True)


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    with Stand(bin_folder) as stand:
        for camera, codec in enumerate(CODECS, 1):
            stand.add_test_camera(codec, "test:mjpeg")
            record_hour(stand, camera, codec)
        events = stand.take_in_recordings()
        recorded = {
            codec: Recorded(events[camera], next((stand.mount / str(camera)).rglob("*.mkv")))
            for camera, codec in enumerate(CODECS, 1)
        }
        stand.start_host()
        stand.start_nginx()
        cookie = stand.log_in()
        print_speed(stand, cookie, recorded)
        print()
        print_first_pictures(stand, cookie, recorded)
        print()
        print_steps_back(stand, cookie, recorded)
        print()
        print_pace(stand, cookie, recorded)


if __name__ == "__main__":
    main()
