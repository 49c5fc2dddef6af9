# SPDX-License-Identifier: Apache-2.0
"""Recording: what cameras cost that are recorded always, without and with viewers, beside ffmpeg copying the same streams.

Simulated cameras send H.264 of 1280x720 at 4 Mbit/s with AAC by RTSP, or 25 JPEG pictures a second of 100 KB by HTTP, from a
process of their own that is not charged. ffmpeg copies each to a Matroska file, one process a camera. Frames are counted as
the cameras send them, 25 a second. Prints two Markdown tables.
"""

import pathlib
import signal
import subprocess
import sys
import tempfile
import time

from stand import Stand, cpu_nanos, descendants, viewers, wait_until
from viewing import QUERY

FPS = 25
COUNTS = (1, 8, 32)
VIEWERS = 5
SETTLE_SECONDS = 2.0
SECONDS = 6.0
CLIP = "testsrc2=size=1280x720:rate=25:duration=10,noise=alls=12:allf=t"
VIDEO = "-c:v libx264 -preset ultrafast -b:v 4M -maxrate 4M -bufsize 1M -g 50 -bf 0 -pix_fmt yuv420p -x264-params aud=1:repeat-headers=1"
KINDS = {
    "H.264": ("rtsp", "h264", ["-rtsp_transport", "tcp"]),
    "MJPEG": ("http", "mjpeg", ["-f", "mpjpeg", "-use_wallclock_as_timestamps", "1"]),
}


def ffmpeg(*arguments):
    subprocess.run(["ffmpeg", "-v", "error", "-nostdin", "-y", *map(str, arguments)], check=True)


def start_cameras(bin_folder, folder):
    """The process, and the addresses by scheme."""
    files = [folder / name for name in ("video.h264", "audio.aac", "picture.jpg")]
    ffmpeg("-f", "lavfi", "-i", CLIP, *VIDEO.split(), files[0])
    ffmpeg("-f", "lavfi", "-i", "sine=sample_rate=48000:duration=10", "-ac", 2, "-c:a", "aac", "-b:a", "128k", files[1])
    ffmpeg("-f", "lavfi", "-i", CLIP, "-frames:v", 1, "-pix_fmt", "yuvj420p", "-q:v", 7, files[2])
    files[2].write_bytes(files[2].read_bytes().ljust(100_000, b"\0"))
    cameras = subprocess.Popen([bin_folder / "bench_cameras", *files], stdout=subprocess.PIPE, text=True)
    ports = cameras.stdout.readline().split()
    return cameras, {scheme: f"{scheme}://127.0.0.1:{port}" for scheme, port in zip(("rtsp", "http"), ports)}


def pss_kib(pid):
    """Memory with its share of what processes have in common, the rings too."""
    lines = pathlib.Path(f"/proc/{pid}/smaps_rollup").read_text().splitlines()
    return sum(int(line.split()[1]) for line in lines if line.startswith("Pss:"))


def disk(pids):
    """Calls that write, and bytes that are to go to a disk."""
    rows = [
        dict(line.split(": ") for line in pathlib.Path(f"/proc/{pid}/io").read_text().splitlines()) for pid in pids
    ]
    return sum(int(row["syscw"]) for row in rows), sum(int(row["write_bytes"]) for row in rows)


def longest_pause(files, seconds):
    """The longest that one of the files did not grow, as far as looks 10 ms apart tell."""
    began = time.monotonic()
    grown = {file: (file.stat().st_size, began) for file in files}
    longest = 0.0
    while (now := time.monotonic()) < began + seconds:
        for file, (size, since) in grown.items():
            if (now_size := file.stat().st_size) != size:
                longest = max(longest, now - since)
                grown[file] = now_size, now
        time.sleep(0.01)
    return max(longest, *(now - since for _, since in grown.values()))


def print_row(kind, count, name, pids, writers, files):
    """Charges the processes for a while; the writers are those that write to the disk, the files what they write."""
    time.sleep(SETTLE_SECONDS)
    cpu, (calls, size), began = cpu_nanos(pids), disk(writers), time.monotonic()
    pause = longest_pause(files, SECONDS)
    seconds = time.monotonic() - began
    cpu = (cpu_nanos(pids) - cpu) / 1e9 / seconds
    calls_after, size_after = disk(writers)
    memory = sum(map(pss_kib, pids)) / 1024
    print(
        f"| {kind} | {count} | {name} | {cpu / count / FPS * 1e6:.0f} | {cpu / count:.2%} | {memory / count:.1f} "
        f"| {(calls_after - calls) / seconds / count:.0f} | {(size_after - size) / seconds / count / 1e6:.2f} "
        f"| {pause:.2f} |",
        flush=True,
    )


def measure_ours(bin_folder, stand, kind, count, cookie):
    stand.start_recorder()
    wait_until(lambda: len(stand.recording_cameras()) == count, 60, f"{count} cameras are recorded")
    recorder = stand.processes("recorder")[0]
    files = [max((stand.mount / str(n)).rglob("*.index"), key=lambda file: file.stat().st_mtime) for n in
             range(1, count + 1)]

    def row(name):
        print_row(kind, count, name, stand.processes("recorder"), [recorder], files)

    row("recorder")
    watching = []
    for viewer in range(VIEWERS):
        query = QUERY.replace("camera=1", f"camera={viewer % count + 1}")
        target = ["--unix", stand.socket, "--cookie", cookie, "--query", query]
        watching.append(viewers(bin_folder, 1, SETTLE_SECONDS + SECONDS + 1, target))
    row(f"recorder, {VIEWERS} viewers")
    if not all(result()["bytes"] for result in watching):
        raise RuntimeError("a viewer saw nothing")
    stand.end("recorder")


def measure_ffmpeg(kind, count, address, options, folder):
    files = [folder / f"{kind}-{count}-{camera}.mkv" for camera in range(count)]
    copiers = [
        subprocess.Popen(["ffmpeg", "-v", "quiet", "-nostdin", *options, "-i", f"{address}/{camera}", "-c", "copy", file])
        for camera, file in enumerate(files)
    ]
    try:
        wait_until(lambda: all(file.exists() and file.stat().st_size for file in files), 60, "ffmpeg writes")
        pids = [copier.pid for copier in copiers]
        print_row(kind, count, "ffmpeg", pids, pids, files)
    finally:
        for copier in copiers:
            copier.send_signal(signal.SIGKILL)
            copier.wait()
        for file in files:
            file.unlink(missing_ok=True)


def print_table(bin_folder, kind, addresses, folder):
    scheme, video_type, options = KINDS[kind]
    print(
        "| video | cameras | by | CPU µs a frame | CPU a camera | MiB a camera | writes/s a camera | MB/s a camera"
        " | longest s between writes |"
    )
    print("|---|---|---|---|---|---|---|---|---|")
    with Stand(bin_folder) as stand:
        stand.start_host()
        stand.start_nginx()
        cookie = stand.log_in()
        known = 0
        for count in COUNTS:
            for camera in range(known, count):
                stand.add_recorded_camera(f"Camera {camera + 1}", f"{addresses[scheme]}/{camera + 1}", video_type)
            known = count
            measure_ours(bin_folder, stand, kind, count, cookie)
            measure_ffmpeg(kind, count, addresses[scheme], options, folder)


def main():
    bin_folder = pathlib.Path(sys.argv[1])
    with tempfile.TemporaryDirectory(prefix="lookhaven-bench-") as name:
        folder = pathlib.Path(name)
        cameras, addresses = start_cameras(bin_folder, folder)
        try:
            for kind in KINDS:
                print_table(bin_folder, kind, addresses, folder)
                print()
        finally:
            cameras.kill()
            cameras.wait()


if __name__ == "__main__":
    main()
