# SPDX-License-Identifier: Apache-2.0
#
# Muxed live streams, taken apart and decoded: they begin at a key frame, every byte decodes, and who may not hear gets
# no sound. And the single picture of such a camera.
import array
import base64
import subprocess
import time
import unittest

from api_test import picture
from installation import Installation, wait_until

RATES = [96000, 88200, 64000, 48000, 44100, 32000, 24000, 22050, 16000, 12000, 11025, 8000, 7350]


def ffmpeg(*arguments, data):
    """Standard output; fails at the first thing that ffmpeg has to say about the data."""
    command = ["ffmpeg", "-v", "error", "-xerror", "-err_detect", "explode", *arguments, "-"]
    done = subprocess.run(command, input=data, capture_output=True, timeout=60, check=True)
    if done.stderr:
        raise AssertionError(f"ffmpeg {arguments}: {done.stderr.decode()}")
    return done.stdout


def thumbnail(form, data):
    small = ["-frames:v", "1", "-vf", "scale=32:18", "-pix_fmt", "rgb24", "-f", "rawvideo"]
    return ffmpeg("-f", form, "-i", "-", *small, data=data)


def adts(config, block):
    """The raw AAC block with a head that says what the AudioSpecificConfig says."""
    profile, rate, channels = config[0] >> 3, (config[0] & 7) << 1 | config[1] >> 7, config[1] >> 3 & 15
    size = len(block) + 7
    head = [0xFF, 0xF1, (profile - 1) << 6 | rate << 2 | channels >> 2, (channels & 3) << 6 | size >> 11,
            size >> 3 & 255, (size & 7) << 5 | 31, 252]
    return bytes(head) + block


def units(frame):
    """The types of the H.264 units in an Annex B frame."""
    return {piece[0] & 31 for piece in frame.split(b"\0\0\1")[1:]}


class MuxedTest(unittest.TestCase):
    @classmethod
    def setUpClass(cls):
        cls.server = cls.enterClassContext(Installation())

    def take(self, camera, account, seconds):
        """The parts of so many seconds after the first."""
        with self.server.live(camera, account) as stream:
            self.assertEqual(stream.response.status, 200)
            parts = [stream.next()]
            until = time.monotonic() + seconds
            while time.monotonic() < until:
                parts.append(stream.next())
        return parts

    def test_both_media_decode_from_the_first_part_on(self):
        parts = self.take(2, "admin", 5)
        head, frame = parts[0]
        self.assertEqual(head["content-type"], "image/H264")
        self.assertLessEqual({7, 8, 5}, units(frame), "parameter sets and a key frame")
        self.assertEqual({head["x-codecs"] for head, _ in parts}, {"H264;AAC"})
        self.assertLess(max(sum(map(len, [*head, *head.values()])) for head, _ in parts), 4096)
        pictures = [(head, data) for head, data in parts if head["content-type"] == "image/H264"]
        blocks = [(head, data) for head, data in parts if head["content-type"] == "audio/AAC"]
        self.assertEqual(len(pictures) + len(blocks), len(parts))
        config = base64.b64decode(head["x-audio-extra"], validate=True)
        rate = RATES[(config[0] & 7) << 1 | config[1] >> 7]
        for medium in pictures, blocks:
            times = [int(head["x-timestamp"]) for head, _ in medium]
            self.assertEqual(times, sorted(set(times)))
            period = 1 / 25 if medium is pictures else 1024 / rate
            self.assertAlmostEqual((times[-1] - times[-51]) / 1e6, 50 * period, delta=0.2)
        self.assertLess(abs(int(pictures[-1][0]["x-timestamp"]) - int(blocks[-1][0]["x-timestamp"])), 300_000)
        self.assertLess(max(int(head["x-age-ms"]) for head, _ in parts[-100:]), 500)
        frames = ffmpeg("-f", "h264", "-i", "-", "-f", "framecrc", data=b"".join(data for _, data in pictures))
        self.assertEqual(sum(not line.startswith(b"#") for line in frames.splitlines()), len(pictures))
        aac = b"".join(adts(config, data) for _, data in blocks)
        sound = array.array("h", ffmpeg("-f", "aac", "-i", "-", "-f", "s16le", data=aac))
        self.assertEqual(len(sound), 1024 * (config[1] >> 3 & 15) * len(blocks))
        self.assertGreater(max(sound), 300, "silent")

    def test_no_sound_for_whom_may_not_hear_and_where_there_is_none(self):
        password = "purple elephant"
        self.server.cli("user", "add", "deaf", text=f"{password}\n")
        self.server.cli("user", "deny", "deaf", "2", "--kind", "audio")
        self.server._sessions["deaf"] = self.server.login("deaf", password)
        silent = self.server.add_camera("Silent", "test:h264?size=320x240&fps=25")
        for camera, account in (2, "deaf"), (silent, "admin"):
            with self.subTest(camera=camera, account=account):
                parts = self.take(camera, account, 2)
                self.assertGreater(len(parts), 40)
                described = {(head["content-type"], head["x-codecs"], head["x-audio-extra"]) for head, _ in parts}
                self.assertEqual(described, {("image/H264", "H264;", "")})
        with self.server.live(2, "viewer") as refused:
            self.assertEqual(refused.response.status, 502, "as for an unknown camera")

    def test_a_stream_ends_when_its_camera_becomes_another_and_begins_anew(self):
        camera = self.server.add_camera("Changing", "test:h264?size=320x240&fps=25")
        with self.server.live(camera) as stream:
            stream.next()
            self.server.cli("camera", "set", str(camera), "--source", "test:h264?size=640x480&fps=25")
            # Without a picture it would stand still for 20 s.
            wait_until(stream.ends, 8, "the stream ends")
        frame = self.take(camera, "admin", 0)[0][1]
        grey = ffmpeg("-f", "h264", "-i", "-", "-frames:v", "1", "-pix_fmt", "gray", "-f", "rawvideo", data=frame)
        self.assertEqual(len(grey), 640 * 480)

    def test_picture_of_any_codec(self):
        parts = self.take(2, "admin", 0)
        answer = self.server.request(picture(camera=2), "admin")
        self.assertEqual((answer.status, answer.headers.get_content_type()), (200, "image/jpeg"))
        self.assertLess(abs(time.time() - float(answer.headers["X-Capture-Time"])), 3)
        one, other = thumbnail("h264", parts[0][1]), thumbnail("mjpeg", answer.body)
        self.assertEqual(len(one), 32 * 18 * 3)
        self.assertLess(sum(abs(a - b) for a, b in zip(one, other)) / len(one), 4, "colours differ from the stream's")
        for profile in {}, {"profileType": 1}:
            jpeg = self.server.request(picture(camera=1, **profile), "admin").body
            self.assertEqual((jpeg[:2], jpeg[-2:]), (b"\xff\xd8", b"\xff\xd9"))


if __name__ == "__main__":
    unittest.main()
