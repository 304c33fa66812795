"""What goes over a phone's bus, seen from outside: launch requests and notifications."""

import pathlib
import re
import subprocess
import tempfile

from phone_driver import wait_until

MATCHES = ("type=method_call,interface=org.tavro.AppControl1,member=Launch",
           "type=method_call,interface=org.freedesktop.Notifications,member=Notify")


class BusWatch:
    def __init__(self, phone):
        self.output = tempfile.NamedTemporaryFile()
        self.monitor = subprocess.Popen(["dbus-monitor", "--address", phone.state["bus"], *MATCHES],
                                        stdout=self.output, stderr=subprocess.DEVNULL)
        # It sees everything from the moment on in which it sees anything.
        wait_until(lambda: phone.launch("corvane.tavro-svc", NOTE="mark") is not None and self.messages(), 10,
                   "the bus being watched")

    def close(self):
        self.monitor.terminate()
        self.monitor.wait()
        self.output.close()

    def messages(self):
        """(path of the receiver, texts) of each message, in order."""
        # Opened anew: the monitor goes on writing where its own place in the file is.
        text = pathlib.Path(self.output.name).read_bytes().decode(errors="replace")
        parts = re.split(r"^method call ", text, flags=re.M)[1:]
        return [(re.search(r"path=(\S+);", part)[1], re.findall(r'^ +string "(.*?)"$', part, re.M | re.S))
                for part in parts]

    def asked(self, since):
        """The operations that the upload service was asked for, after the first `since` messages."""
        return [texts[texts.index("TAVRO_OPERATION_TYPE") + 1] for to, texts in self.messages()[since:]
                if to == "/corvane/tavro_svc" and "TAVRO_OPERATION_TYPE" in texts]

    def notifications(self, since):
        """(title, text) of each notification."""
        return [(texts[2], texts[3]) for to, texts in self.messages()[since:] if to == "/org/freedesktop/Notifications"]
