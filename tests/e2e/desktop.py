"""A desktop session for a phone that does not bring its own: a display with a window manager, and a bus."""

import contextlib
import os
import pathlib
import subprocess

import dbus

from phone_driver import wait_until


class Desktop:
    """Lives as long as its `with` block; `environment` is that of the session."""

    def __init__(self, folder, size="1000x800"):
        self.folder, self.size = pathlib.Path(folder), size
        self.programs = contextlib.ExitStack()

    def __enter__(self):
        read_end, write_end = os.pipe()
        self.run("Xvfb", "-displayfd", str(write_end), "-screen", "0", f"{self.size}x24", "-noreset",
                 pass_fds=[write_end])
        os.close(write_end)
        bus = self.run("dbus-daemon", "--session", "--nofork", "--print-address", stdout=subprocess.PIPE, text=True,
                       env={**os.environ, "XDG_RUNTIME_DIR": str(self.folder), "GSETTINGS_BACKEND": "memory"})
        number = os.read(read_end, 16).decode().strip()
        self.programs.callback(os.close, read_end)
        self.environment = {"DISPLAY": f":{number}", "DBUS_SESSION_BUS_ADDRESS": bus.stdout.readline().strip()}
        self.window_manager = self.run("openbox", "--sm-disable")
        wait_until(lambda: "window id" in subprocess.run(
            ["xprop", "-display", f":{number}", "-root", "_NET_SUPPORTING_WM_CHECK"], capture_output=True, text=True).stdout)
        return self

    def __exit__(self, *_):
        self.programs.close()

    def run(self, *command, **options):
        """Start a program of the session, which is ended with it."""
        environment = {**os.environ, **getattr(self, "environment", {})}
        program = subprocess.Popen(command, **{"env": environment, "stderr": subprocess.DEVNULL, **options})
        self.programs.callback(program.wait)
        self.programs.callback(program.terminate)
        return program

    def switch_screen_reader_on(self):
        """The registry comes first: programs that find none at their start do not publish their windows."""
        session = dbus.bus.BusConnection(self.environment["DBUS_SESSION_BUS_ADDRESS"])
        address = session.call_blocking("org.a11y.Bus", "/org/a11y/bus", "org.a11y.Bus", "GetAddress", "", ())
        dbus.bus.BusConnection(str(address)).start_service_by_name("org.a11y.atspi.Registry")
        for name in ("IsEnabled", "ScreenReaderEnabled"):
            session.call_blocking("org.a11y.Bus", "/org/a11y/bus", dbus.PROPERTIES_IFACE, "Set", "ssv",
                                  ("org.a11y.Status", name, True))
