"""What screenshots and videos show, and the window that they are taken of."""

import contextlib
import subprocess

import gi

gi.require_version("Gst", "1.0")
from gi.repository import Gst  # noqa: E402

from phone_driver import wait_until  # noqa: E402

BLUE, ORANGE = (32, 64, 192), (240, 128, 16)  # the window, above and below
BLACK = (0, 0, 0)  # what is hidden


class Pixels:
    def __init__(self, path):
        text = subprocess.check_output(["identify", "-format", "%m %w %h", path], text=True).split()
        self.kind, self.size = text[0], (int(text[1]), int(text[2]))
        self.bytes = subprocess.check_output(["convert", path, "-depth", "8", "rgb:-"])

    def at(self, x, y):
        start = 3 * (y * self.size[0] + x)
        return tuple(self.bytes[start:start + 3])

    def some_colours(self):
        return {self.at(x, y) for x in range(0, self.size[0], 20) for y in range(0, self.size[1], 20)}


def is_near(one, other, distance=8):
    return all(abs(a - b) <= distance for a, b in zip(one, other))


def frames(path):
    """(second, length, whether it is a key frame) of each frame that a player finds."""
    Gst.init(None)
    pipeline = Gst.parse_launch("filesrc name=file ! qtdemux ! appsink name=sink sync=false")
    pipeline.get_by_name("file").set_property("location", str(path))
    pipeline.set_state(Gst.State.PLAYING)
    found = []
    while sample := pipeline.get_by_name("sink").emit("try-pull-sample", 5 * Gst.SECOND):
        frame = sample.get_buffer()
        found.append((frame.pts / 1e9, frame.duration / 1e9, not frame.has_flags(Gst.BufferFlags.DELTA_UNIT)))
    pipeline.set_state(Gst.State.NULL)
    return found


def length(path):
    """Seconds from the first frame to the end of the last."""
    found = frames(path)
    return found[-1][0] + found[-1][1] if found else 0


@contextlib.contextmanager
def coloured_window(phone):
    picture = phone.directory / "window.png"
    subprocess.run(["convert", "-size", "720x640", "xc:rgb%s" % (BLUE,), "xc:rgb%s" % (ORANGE,), "-append", picture],
                   check=True)
    window = subprocess.Popen([phone.program, "exec", "--dir", str(phone.directory), "--", "display", picture],
                              stdin=subprocess.DEVNULL)
    shown = phone.directory / "shown.png"
    wait_until(lambda: is_near(Pixels(phone.screenshot(shown)).at(300, 1000), ORANGE), what="the window")
    yield
    window.terminate()
    window.wait()
