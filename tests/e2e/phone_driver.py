"""Drives a phone of its own from outside, as a person would: commands, and the windows through the
accessibility tree. Start the phone before the first Screen: the tree is found through the phone's bus."""

import html
import os
import pathlib
import shutil
import subprocess
import tempfile
import time

ROOT = pathlib.Path(__file__).resolve().parents[2]
BUILD = pathlib.Path(os.environ.get("TAVRO_BUILD_DIR", ROOT / "build" / "debug"))
CLIENT = "corvane.tavro-lite"


def wait_until(condition, timeout=20.0, what="the condition"):
    """The first true value of condition(); AssertionError when there is none in time."""
    end = time.monotonic() + timeout
    while True:
        value = condition()
        if value:
            return value
        if time.monotonic() > end:
            text = what() if callable(what) else what
            raise AssertionError(f"{text} did not come true within {timeout} s")
        time.sleep(0.05)


class Phone:
    """One phone in a folder of its own, removed with it unless the caller named one."""

    def __init__(self, directory=None, program=BUILD / "bin" / "tavro-phone", environment=None):
        self.is_temporary = directory is None
        self.directory = pathlib.Path(directory or tempfile.mkdtemp(prefix="tavro-e2e."))
        self.program = str(program)
        self.environment = {**os.environ, **(environment or {})}
        self.state = {}

    def __enter__(self):
        return self

    def __exit__(self, *_):
        self.stop()
        if self.is_temporary:
            shutil.rmtree(self.directory, ignore_errors=True)

    def command(self, name, *arguments, check=True, timeout=60):
        result = subprocess.run([self.program, name, "--dir", str(self.directory), *arguments],
                                capture_output=True, text=True, timeout=timeout, env=self.environment,
                                stdin=subprocess.DEVNULL)
        if check and result.returncode != 0:
            raise AssertionError(f"tavro-phone {name}: {result.returncode} {result.stderr}\n{self.output()}")
        return result

    def start(self, *options):
        text = self.command("start", "--headless", "--detach", *options).stdout
        self.state = dict(line.split("=", 1) for line in text.splitlines())
        return self

    def stop(self):
        return self.command("stop", check=False)

    def status(self):
        """What runs: {part: pid}."""
        lines = self.command("status").stdout.splitlines()
        parts = (line.split(": runs, pid ") for line in lines if ": runs, pid " in line)
        return {name: int(pid) for name, pid in parts}

    def end(self, app_id=CLIENT, how="KILL"):
        """Send the application the signal, if it runs, and wait until it is gone."""
        process = self.status().get(app_id)
        if process:
            self.execute("kill", f"-{how}", str(process), check=False)
            wait_until(lambda: self.status().get(app_id) != process, what=f"the end of {app_id}")

    def execute(self, *command, check=True):
        return self.command("exec", "--", *command, check=check)

    def launch(self, app_id=CLIENT, operation=None, reply=False, **extra_data):
        options = ["--operation", operation] if operation else []
        options += ["--reply"] if reply else []
        return self.command("launch", *options, app_id, *(f"{k}={v}" for k, v in extra_data.items())).stdout

    def preference(self, *words, check=True):
        return self.command("preference", *words, check=check).stdout.strip()

    def screenshot(self, path):
        self.command("screenshot", str(path))
        return pathlib.Path(path)

    def close_notifications(self):
        """Put the notifications away that lie over the phone's screen."""
        self.execute("gdbus", "call", "--session", "-d", "org.freedesktop.Notifications", "-o",
                     "/org/freedesktop/Notifications", "-m", "org.dunstproject.cmd0.NotificationCloseAll", check=False)
        time.sleep(0.2)  # until the display has painted what lay below

    def log(self):
        return self.command("log").stdout

    def storage(self):
        """The folder that the phone's programs see as /opt/usr."""
        lines = (self.directory / "run" / "state").read_text().splitlines()
        return pathlib.Path(dict(line.split("=", 1) for line in lines)["usr"])

    def data(self):
        """The folder of what the client keeps."""
        return self.storage() / "apps" / CLIENT / "shared/data"

    def press(self, *keys):
        self.execute(str(BUILD / "tests" / "press_keys"), *keys)

    def output(self):
        """What the phone's programs wrote to standard error."""
        path = self.directory / "run" / "output.log"
        return path.read_text(errors="replace") if path.exists() else ""


class Screen:
    """What a screen reader sees of the phone, which must have been started with --accessible. One per process:
    the accessibility library keeps its first connection."""

    def __init__(self, phone, application=CLIENT):
        os.environ["DBUS_SESSION_BUS_ADDRESS"] = phone.state["bus"]
        os.environ.pop("AT_SPI_BUS_ADDRESS", None)
        os.environ.pop("DISPLAY", None)  # the library would look for another bus there
        import gi
        gi.require_version("Atspi", "2.0")
        from gi.repository import Atspi
        self.atspi = Atspi
        self.application = application
        Atspi.init()

    def _nodes(self):
        """All visible nodes, parents first; nodes that vanish while we look are skipped."""
        from gi.repository import GLib
        desktop = self.atspi.get_desktop(0)
        pending = [desktop.get_child_at_index(i) for i in range(desktop.get_child_count())]
        # What is shown now, not what once was: of each application, since not all take it over from the desktop.
        for node in filter(None, [desktop, *pending]):
            node.set_cache_mask(self.atspi.Cache.NONE)
            node.clear_cache()
        while pending:
            node = pending.pop(0)
            try:
                if node is None:
                    continue
                yield node
                pending[:0] = [node.get_child_at_index(i) for i in range(node.get_child_count())]
            except GLib.Error:
                continue

    def _matches(self, node, name, role):
        from gi.repository import GLib
        try:
            is_shown = node.get_state_set().contains(self.atspi.StateType.SHOWING)
            return node.get_name() == name and is_shown and role in (None, node.get_role_name())
        except GLib.Error:
            return False

    def _shown_name(self, node):
        from gi.repository import GLib
        try:
            is_shown = node.get_state_set().contains(self.atspi.StateType.SHOWING)
            return node.get_name() if is_shown else ""
        except GLib.Error:
            return ""

    def look(self, name, role=None):
        """The first node that is shown under this name now, or None."""
        return next((node for node in self._nodes() if self._matches(node, name, role)), None)

    def find(self, name, role=None, timeout=10.0):
        return wait_until(lambda: self.look(name, role), timeout,
                          lambda: f"'{name}' on the screen {self.names()}")

    wait_for = find

    def wait_gone(self, name, role=None, timeout=10.0):
        wait_until(lambda: self.look(name, role) is None, timeout, f"'{name}' leaving the screen")

    def names(self):
        """The names of all that is shown, in reading order."""
        return [name for name in (self._shown_name(node) for node in self._nodes()) if name]

    def activate(self, name, role=None, timeout=10.0):
        """Do what a tap on the control does."""
        node = self.find(name, role, timeout)
        action = node.get_action_iface()
        names = [action.get_action_name(i) for i in range(action.get_n_actions())] if action else []
        wanted = next((n for n in ("click", "activate", "press") if n in names), None)
        if wanted:
            assert action.do_action(names.index(wanted)), f"'{name}' did not react to {wanted}"
            return
        # Items of lists and grids have no action of their own: their list selects them.
        selection = node.get_parent().get_selection_iface()
        assert selection, f"'{name}' ({node.get_role_name()}) has no action but {names}"
        assert selection.select_child(node.get_index_in_parent()), f"'{name}' could not be selected"

    def middle(self, node):
        """Where a finger touches it: x and y in the window, which fills the screen, as texts."""
        box = node.get_component_iface().get_extents(self.atspi.CoordType.WINDOW)
        return str(box.x + box.width // 2), str(box.y + box.height // 2)

    def description(self, name, timeout=10.0):
        return self.find(name, None, timeout).get_description()

    def type_text(self, name, text, timeout=10.0):
        """Replace what the entry holds."""
        entry = self.find(name, None, timeout).get_editable_text_iface()
        assert entry, f"'{name}' takes no text"
        # The toolkit takes its own markup here; what a person types is plain text.
        markup = html.escape(text, quote=False).replace("\n", "<br/>")
        assert entry.set_text_contents(markup), f"'{name}' did not take the text"

    def text(self, name, role=None, timeout=10.0):
        node = self.find(name, role, timeout)
        return self.atspi.Text.get_text(node, 0, self.atspi.Text.get_character_count(node))
