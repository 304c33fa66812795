"""Pictures of the screens, in both palettes and at each size: what docs/pictures/ shows."""

import pathlib
import subprocess
import sys
import time

import stored_reports as stored
from phone_driver import ROOT, Phone, wait_until
from road import IN_PROCESS, Road

TITLE = "Thumbnails stay grey after update"
TEXT = "Since this morning's update the album view shows grey boxes. Opening a picture and going back mends that one only."
IDEA = "Swipe to undo in Notes"
ANSWERED = "Charging stops at 80 percent"
SOLVED = 3
NOT_SENT = "0"  # Nothing tries again by itself.
FAILED = "Map is cut off at the right"
CAPTURED = "The chip covers the title"
HOUR = 3600
CRASHED = {"operation": "CRASH_PROCESS", "TAVRO_CRASH_APP_ID": "org.example.mail", "TAVRO_CRASH_APP_NAME": "Mail",
           "TAVRO_CRASH_FOLDER": "mail_17_aa"}
VARIANTS = [(size, theme) for size in ("720x1280", "480x800", "1280x720", "800x480") for theme in ("light", "dark")]


class Pictures:
    def __init__(self, folder, size, theme):
        self.folder = pathlib.Path(folder)
        self.ending = f"{size}-{theme}.png"
        self.size, self.theme = size, theme
        width, height = map(int, size.split("x"))
        self.is_upright = height > width  # on its side, the attachments are below what is shown

    def take(self, phone, name):
        phone.close_notifications()
        path = phone.screenshot(self.folder / f"{name}-{self.ending}")
        # A fifth of the size, and looks the same: the screens have few colours.
        subprocess.run(["mogrify", "-colors", "128", "-strip", str(path)], check=True)
        print(path, flush=True)

    def problem(self, road):
        road.screen.activate("Report a problem")
        road.screen.activate("About: Choose what it is about")
        road.screen.wait_for("Battery")
        self.take(road.phone, "picker")
        road.screen.activate("Search")
        road.screen.type_text("Search for a name", "ba")
        road.screen.wait_gone("Network")
        self.take(road.phone, "picker-search")
        road.screen.activate("Battery")
        road.write(TITLE, TEXT, "What happened? What did you expect?")
        if self.is_upright:
            self.attach(road)
        self.take(road.phone, "problem")

    def attach(self, road):
        road.screen.activate("Attach pictures")
        self.take(road.phone, "attach")
        road.screen.activate("Choose from gallery")
        road.screen.activate("morning.png")
        self.take(road.phone, "gallery")
        road.screen.activate("banner.jpg")
        road.screen.activate("Attach (2)")
        road.screen.wait_for("Remove banner.jpg")
        wait_until(lambda: "kB" in road.screen.description("System log"), what="the log's size")

    def what_is_sent(self, road):
        road.screen.activate("More")
        road.screen.wait_for("What is sent")
        self.take(road.phone, "menu")
        road.screen.activate("What is sent")
        road.screen.wait_for("Your text")
        self.take(road.phone, "review")
        if self.is_upright:
            wait_until(lambda: road.screen.description("Device status"), what="the device status")
            road.screen.activate("Device status")
            road.screen.wait_gone("Your text")
            self.take(road.phone, "device-status")
            road.back()
        if self.is_upright:
            road.screen.activate("Picture 1")
            road.screen.wait_gone("Your text")
            self.take(road.phone, "picture")
            road.back()
        road.back()

    def leaving(self, road):
        road.screen.activate("Back")
        road.screen.wait_for("Keep writing")
        self.take(road.phone, "leave")
        road.screen.activate("Save as draft")
        road.screen.wait_for("Report a problem")
        road.write_idea("Network", IDEA, "Two fingers to the left take back what was typed last.")
        self.take(road.phone, "idea")
        road.back()
        road.screen.activate("Discard")
        road.screen.wait_for("Report a problem")

    def capture(self, road):
        """A screenshot that is edited, and a video, of a window that shows the landing page."""
        phone, screen = road.phone, road.screen
        shown = phone.screenshot(phone.directory / "shown.png")
        window = subprocess.Popen([phone.program, "exec", "--dir", str(phone.directory), "--", "display", shown],
                                  stdin=subprocess.DEVNULL)
        phone.execute("xdotool", "search", "--sync", "--onlyvisible", "--class", "display")
        phone.launch()
        road.write_problem("Battery", CAPTURED, "Only after the phone was turned on its side and back.")
        self.attach_from(road, "Take screenshot")
        screen.wait_for("Capture")
        self.take(phone, "capture-screenshot")
        screen.activate("Capture")
        screen.wait_for("Selected area")
        self.edit(road)
        self.record(road)
        wait_until(lambda: sum(name.startswith("Remove ") for name in screen.names()) == 2, what="picture and video")
        self.take(phone, "problem-captured")
        window.terminate()
        window.wait()
        road.send()
        road.open_history()
        screen.activate(road.wait_for_row(CAPTURED, "Submitted"))
        screen.wait_for("Status: Submitted")
        self.take(phone, "details-video")
        road.back()
        road.back()

    def attach_from(self, road, source):
        time.sleep(0.6)  # a compose screen that has just come up takes no touches yet
        road.phone.execute("xdotool", "mousemove", "240", "240", "click", "--repeat", "20", "5")  # to the foot
        road.screen.activate("Attach pictures")
        road.screen.activate(source)

    def edit(self, road):
        def drag(tool, name, *places):
            """Draw with the tool; places in thousandths of the page."""
            road.screen.activate(tool)
            page = road.screen.find(name).get_component_iface().get_extents(road.screen.atspi.CoordType.SCREEN)
            points = [(str(page.x + page.width * x // 1000), str(page.y + page.height * y // 1000)) for x, y in places]
            road.phone.execute("xdotool", "mousemove", *points[0], "mousedown", "1")
            for point in points[1:]:
                road.phone.execute("xdotool", "mousemove", *point)
            road.phone.execute("xdotool", "mouseup", "1")

        self.take(road.phone, "editor")
        drag("Hide", "Picture, no hidden area chosen", (545, 420), (600, 450), (800, 530))
        road.screen.wait_for("Hidden area 1 of 1")
        drag("Blur", "Picture, no hidden area chosen", (260, 545), (350, 560), (580, 620))
        road.screen.wait_for("Hidden area 2 of 2")
        self.take(road.phone, "editor-hidden")
        road.screen.activate("Done")
        road.screen.wait_for("Title")

    def record(self, road):
        screen = road.screen
        self.attach_from(road, "Record video")
        screen.wait_for("Record")
        self.take(road.phone, "capture-video")
        screen.activate("Record")
        screen.wait_for("Show the controls")
        wait_until(lambda: screen.description("Show the controls") <= "00:57", what="three seconds")
        self.take(road.phone, "capture-recording")
        screen.activate("Show the controls")
        screen.activate("Pause")
        screen.wait_for("Go on")
        self.take(road.phone, "capture-paused")
        screen.activate("Stop")
        screen.wait_gone("Flash_top")

    def history(self, road):
        stored.remove_all_reports(road.phone)
        road.open_history()
        road.screen.wait_for("Write a report")
        self.take(road.phone, "history-empty")
        stored.add_report(road.phone, FAILED, NOT_SENT, "Browser", "The right third stays white.", age=HOUR)
        stored.add_report(road.phone, IDEA, stored.DRAFT, "Network", "Two fingers.", stored.IDEA, age=2 * HOUR)
        stored.add_report(road.phone, "Loud click after a call", stored.COMPLETED, "Phone", "It clicks.", age=3 * HOUR)
        stored.add_report(road.phone, "Camera stopped", stored.SUBMITTED, "Camera", "I took a picture.", age=4 * HOUR,
                          dump="/opt/usr/media/Orbel/tavro_aa.zip")
        road.back()
        road.write_problem("Battery", ANSWERED, "It stays at 80 percent overnight, with any charger.")
        road.send()
        number = road.arrived(ANSWERED)["id"]
        road.desk.answer(number, IN_PROCESS, "Thank you. Is the option that spares the battery switched on?")
        road.open_history()
        road.screen.wait_for(road.wait_for_row(ANSWERED, "New reply"))
        self.take(road.phone, "history")
        road.screen.activate(road.wait_for_row(ANSWERED))
        road.screen.wait_for("Status: In process")
        self.take(road.phone, "details")
        road.desk.answer(number, SOLVED, "Version 2.1 mends this.")
        road.screen.wait_for("Status: Completed", timeout=20)
        road.screen.activate("Still happens")
        road.screen.wait_for("What do you still see? (optional)")
        self.take(road.phone, "follow-up")
        road.back()
        road.back()
        road.screen.activate(road.wait_for_row(FAILED))
        road.screen.wait_for("Status: Sending failed")
        self.take(road.phone, "details-failed")
        road.back()

    def deleting(self, road):
        road.screen.activate("More")
        road.screen.activate("Select")
        road.screen.wait_for("Select items")
        for title in (ANSWERED, FAILED):
            road.screen.activate(road.wait_for_row(title))
        road.screen.wait_for("Select items (2)")
        self.take(road.phone, "history-select")
        road.screen.activate("Delete")
        road.screen.wait_for("Delete 2 reports?")
        road.phone.execute("xdotool", "key", "Return")
        road.screen.wait_for("Undo")
        road.screen.wait_for("More")
        self.take(road.phone, "undo")
        road.screen.wait_gone("Undo", timeout=30)
        road.back()

    def crash(self, road):
        folder = road.phone.storage() / "share/crash/dump" / CRASHED["TAVRO_CRASH_FOLDER"]
        folder.mkdir(parents=True)
        (folder / "core.coredump.gz").write_bytes(bytes(range(256)) * 800)
        (folder / "app.cs").write_text("Application: org.example.mail\nSignal: 11 (SIGSEGV)\n#0 play_next (player.c:40)\n")
        road.phone.launch(**CRASHED)
        road.screen.wait_for("Mail stopped")
        self.take(road.phone, "crash-question")
        road.screen.activate("Report")
        road.screen.type_text("What were you doing when it stopped?", "I opened a letter with many pictures.")
        self.take(road.phone, "crash-report")

    def play(self):
        with Phone() as phone:
            phone.start("--accessible", "--size", self.size, "--no-client")
            phone.preference("set", "tavro_theme", "string", self.theme)
            phone.launch()
            road = Road(phone)
            road.choose_account()
            road.add_pictures("morning.png", "banner.jpg")
            self.problem(road)
            self.what_is_sent(road)
            self.leaving(road)
            self.capture(road)
            self.history(road)
            self.deleting(road)
            self.crash(road)


if __name__ == "__main__":
    try:
        target = pathlib.Path(sys.argv[1] if len(sys.argv) > 1 else ROOT / "docs" / "pictures" / "screens")
        target.mkdir(parents=True, exist_ok=True)
        if len(sys.argv) > 3:
            Pictures(target, sys.argv[2], sys.argv[3]).play()
        else:
            # A process each: the accessibility library keeps its first connection.
            for size, theme in VARIANTS:
                subprocess.run([sys.executable, __file__, str(target), size, theme], check=True)
    except AssertionError as fault:
        sys.exit(f"pictures: {fault}")
