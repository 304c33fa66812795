"""Plays the road of a report on a phone of its own, one line and one picture a step."""

import pathlib
import sys
import tempfile

from phone_driver import Phone, wait_until
from road import IN_PROCESS, Road

TITLE = "Thumbnails stay grey after update"
TEXT = "Since this morning's update the album view shows grey boxes. Opening a picture mends that one only."
REPLY = "Thank you, we can see it too. A fix is being tested."
IDEA = "Swipe to undo in Notes"


class Demo:
    def __init__(self, folder):
        self.folder = pathlib.Path(folder)
        self.folder.mkdir(parents=True, exist_ok=True)
        self.step = 0

    def say(self, phone, what, with_notifications=False):
        self.step += 1
        if not with_notifications:
            phone.close_notifications()
        path = phone.screenshot(self.folder / f"{self.step:02d}.png")
        print(f"{self.step:2d}. {what}: {path}", flush=True)

    def problem(self, road):
        road.write_problem("Battery", TITLE, TEXT)
        self.say(road.phone, "a problem with its target, title and description")
        road.attach("morning.png", "banner.jpg")
        self.say(road.phone, "two pictures attached")
        road.send()
        self.say(road.phone, "sent; the phone says so", with_notifications=True)
        report = road.arrived(TITLE)
        pictures = road.desk.pictures(report["id"])
        assert len(pictures) == 2, f"the desk's page shows {len(pictures)} pictures"
        road.open_history()
        road.wait_for_row(TITLE, "Submitted")
        self.say(road.phone, f"the desk has report {report['id']} with its pictures; the history knows")
        return report["id"]

    def answer(self, road, number):
        road.desk.answer(number, IN_PROCESS, REPLY)
        (self.folder / "desk.html").write_text(road.desk.page(f"/staff/reports/{number}"))
        road.wait_for_row(TITLE, "In process")
        self.say(road.phone, "support answered; the phone notifies", with_notifications=True)
        self.say(road.phone, "the history shows it without being reopened")
        road.back()
        road.screen.wait_for("My Reports")
        wait_until(lambda: road.screen.description("My Reports") == "1 new answer", 10, "the badge counting 1")
        self.say(road.phone, "the badge counts 1")
        road.open_history()
        road.screen.activate(road.wait_for_row(TITLE))
        road.screen.wait_for(REPLY)
        self.say(road.phone, "the reply is read")
        road.back()
        road.back()
        wait_until(lambda: road.screen.description("My Reports") == "No new answers", 10, "the badge being gone")
        self.say(road.phone, "the badge is gone")

    def idea(self, road):
        road.write_idea("Something else", IDEA, "Two fingers to the left take back what was typed last.")
        self.say(road.phone, "an idea takes the same road")
        road.send()
        road.arrived(IDEA)
        road.open_history()
        road.wait_for_row(IDEA, "Submitted")
        self.say(road.phone, "the idea is with the desk")

    def play(self):
        with Phone() as phone:
            phone.start("--accessible")
            road = Road(phone)
            road.screen.wait_for("Continue")
            self.say(phone, "first run: the machine's user is offered")
            road.choose_account()
            self.say(phone, "what a person can do here")
            road.add_pictures("morning.png", "banner.jpg")
            number = self.problem(road)
            self.answer(road, number)
            self.idea(road)
            phone.stop()
            leaks = [line for line in phone.log().splitlines() if "MemoryLeakReport total leak" in line]
            assert leaks and leaks[-1].endswith("= 0"), f"leak report: {leaks}"
            print("The answer arrived, nothing was lost, and the leak report says 0.")


if __name__ == "__main__":
    try:
        Demo(sys.argv[1] if len(sys.argv) > 1 else tempfile.mkdtemp(prefix="tavro-demo.")).play()
    except AssertionError as fault:
        sys.exit(f"demo: {fault}")
