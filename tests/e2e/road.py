"""The road of a report, step by step, as a person walks it: shared by the demonstration and the tests."""

import contextlib
import shutil

from phone_driver import ROOT, Phone, Screen, wait_until
from staff_desk import StaffDesk

IN_PROCESS = 2


class Road:
    def __init__(self, phone):
        self.phone = phone
        self.screen = Screen(phone)
        self.has_seen_what_is_sent = False
        self.desk = StaffDesk(phone.state["desk"], phone.state["desk_token"])

    @classmethod
    @contextlib.contextmanager
    def started(cls, *pictures, options=(), environment=None):
        """On a phone of its own, with an account and these pictures in the gallery."""
        with Phone(environment=environment) as phone:
            phone.start("--accessible", *options)
            road = cls(phone)
            road.choose_account()
            road.add_pictures(*pictures)
            yield road

    def put(self, name, content):
        """A file of the gallery."""
        path = self.phone.storage() / "media/Images" / name
        path.parent.mkdir(parents=True, exist_ok=True)
        path.write_bytes(content)
        return path

    def add_pictures(self, *names):
        """Put pictures into the phone's gallery; returns their paths on this machine."""
        folder = self.phone.directory / "usr" / "media" / "Images"
        folder.mkdir(parents=True, exist_ok=True)
        paths = [folder / name for name in names]
        for path in paths:
            if path.suffix == ".png":
                self.phone.screenshot(path)
            else:
                shutil.copy(ROOT / "res" / "images" / "kxbanner2.jpg", path)
        return paths

    def choose_account(self):
        self.screen.activate("Continue")
        self.screen.wait_for("Report a problem")

    def choose_target(self, target):
        self.screen.activate("About: Choose what it is about")
        self.screen.activate(target)
        self.screen.wait_for("About: " + target)

    def write(self, title, description, hint):
        self.screen.type_text("Title", title)
        self.screen.type_text(hint, description)

    def write_problem(self, target, title, description):
        self.screen.activate("Report a problem")
        self.choose_target(target)
        self.write(title, description, "What happened? What did you expect?")

    def write_idea(self, target, title, description):
        self.screen.activate("Share an idea")
        self.choose_target(target)
        self.write(title, description, "What would make it better?")

    def attach(self, *names):
        self.screen.activate("Attach pictures")
        self.screen.activate("Choose from gallery")
        for name in names:
            self.screen.activate(name)
        self.screen.activate(f"Attach ({len(names)})")
        for name in names:
            self.screen.wait_for("Remove " + name)

    def open_review(self):
        self.screen.activate("More")
        self.screen.activate("What is sent")
        self.screen.wait_for("Your text")

    def send(self):
        self.screen.activate("Send")
        if not self.has_seen_what_is_sent:
            self.screen.wait_for("What is sent")
            self.screen.activate("Send")
            self.has_seen_what_is_sent = True
        self.screen.wait_for("My Reports")

    def arrived(self, title, timeout=20):
        return wait_until(lambda: self.desk.find(title), timeout, f"'{title}' reaching the desk")

    def open_history(self):
        self.screen.activate("My Reports")

    def wait_for_row(self, *texts, timeout=20):
        """A row of the history that shows all of the texts."""
        def rows():
            return [name for name in self.screen.names() if all(text in name for text in texts)]
        return wait_until(rows, timeout, lambda: f"{texts} in {self.screen.names()}")[0]

    def kept_files(self):
        """What the client keeps of an unfinished report; what ends in .new is on its way there."""
        return sorted(path for path in self.phone.data().glob(".tavro.compose*") if path.suffix != ".new")

    def wait_until_kept(self, text):
        wait_until(lambda: any(text in path.read_text() for path in self.kept_files()), what=f"'{text}' being kept")

    def relaunch(self):
        """End the client, whatever it was doing, and bring it back to its landing page."""
        self.phone.end()
        self.phone.launch()
        self.screen.wait_for("Report a problem")

    def back(self):
        self.screen.activate("Back")
