# SPDX-License-Identifier: Apache-2.0
#
# A player as a client of the web API has it: opened, steered and read.
from installation import PLAYER, call
from parts import Parts

BY_TIME = "PlayMjpegEventNoFrameId"
FAR = 10**6


def playing(server, event, account="admin", timestamp=1, method="PlayMjpegEvent", cookie=None, **parameters):
    """The player's stream as a Parts; the caller closes it."""
    headers = {"Cookie": f"id={cookie or server.session(account)}"}
    return Parts(*server.open(call(PLAYER, method, eventid=event, timestamp=timestamp, **parameters), headers=headers))


def steer(server, method, **form):
    return server.request(call("VEXO.Playback", method), "admin", form={"timestamp": 1, **form})


def numbered(parts, count, times=None):
    """Pairs of a number part and the picture after it; the capture times are added to the list."""
    pairs = []
    while len(pairs) < count:
        head, body = parts.next()
        assert head["content-type"] == "text/plain", head
        picture_head, picture = parts.next()
        assert picture_head["content-type"] == "image/jpeg", picture_head
        if times is not None:
            times.append(picture_head["x-capture-time"])
        pairs.append((int(body), picture))
    return pairs


def pictures(parts, count):
    return [parts.next()[1] for _ in range(count)]
