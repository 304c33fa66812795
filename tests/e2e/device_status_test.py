"""The device status that goes with a problem report, and the automatic draft before the battery ends: the hardware is
played on the machine's system bus, everything else is real."""

import contextlib
import json
import re
import subprocess

import dbus
import pytest

import stored_reports
from phone_driver import ROOT, wait_until
from road import Road

UPOWER = "org.freedesktop.UPower"
DISPLAY_DEVICE = "/org/freedesktop/UPower/devices/DisplayDevice"
CHARGING, DISCHARGING = 1, 2
ROAMING, HOME = 5, 1
DISABLED, REGISTERED = 3, 8
HINT = "What happened? What did you expect?"

MODEMS = [
    {"path": 10, "signal": 0, "state": DISABLED, "registration": HOME, "name": "Later"},
    {"path": 2, "signal": 51, "state": REGISTERED, "registration": ROAMING, "name": "Net & Co\nRSSI : 6",
     "location": "262,01,8BE3,2BAF41,0000"},
    {"path": 3, "signal": 80, "state": REGISTERED, "registration": HOME, "name": ""},
    {"path": 4, "signal": 80, "state": REGISTERED, "registration": HOME},
    {"path": 5, "signal": 80, "state": REGISTERED},
]


class Machine:
    """A system bus with the services that a test puts there."""

    def __init__(self):
        self.services = contextlib.ExitStack()
        self.address = ""
        daemon = self._run("dbus-daemon", "--session", "--nofork", "--print-address")
        self.address = daemon.stdout.readline().strip()
        self.bus = dbus.bus.BusConnection(self.address)

    def _run(self, *command):
        process = subprocess.Popen(command, stdout=subprocess.PIPE, text=True,
                                   env={"PATH": "/usr/bin:/bin", "DBUS_SYSTEM_BUS_ADDRESS": self.address})
        self.services.callback(process.wait)
        self.services.callback(process.kill)
        return process

    def plug_in_battery(self):
        self._run("/usr/bin/python3", "-m", "dbusmock", "--system", "--template", "upower")
        wait_until(lambda: self.bus.name_has_owner(UPOWER), what="the power service")

    def set_battery(self, percent, state=DISCHARGING, is_present=True):
        device = self.bus.get_object(UPOWER, "/org/freedesktop/UPower")
        values = {"IsPresent": is_present, "State": dbus.UInt32(state), "Percentage": dbus.Double(percent)}
        device.SetDeviceProperties(DISPLAY_DEVICE, dbus.Dictionary(values, signature="sv"),
                                   dbus_interface="org.freedesktop.DBus.Mock")

    def plug_in_modems(self, modems):
        script = str(ROOT / "tests/support/fake_modem_manager.py")
        assert self._run("/usr/bin/python3", script, json.dumps(modems)).stdout.readline() == "ready\n"


@pytest.fixture(scope="module")
def machine():
    machine = Machine()
    with machine.services:
        yield machine


@pytest.fixture(scope="module")
def road(machine):
    with Road.started(environment={"DBUS_SYSTEM_BUS_ADDRESS": machine.address}) as road:
        yield road


def device_status(road, title):
    """The device status as it arrived at the desk, as lines; None when the report has none."""
    report = road.arrived(title)
    files = [file for file in report["attachments"] if file["kind"] == "device_status"]
    if not files:
        return None
    assert re.fullmatch(r"VantorCommunity_\d{14}(_\d+)?\.txt", files[0]["name"]), files
    return road.desk.page(f"/staff/reports/{report['id']}/files/{files[0]['number']}").splitlines()


def drafts(phone):
    return stored_reports.column(phone, "SELECT VOC_ID FROM TABLE_VOC WHERE VOC_STATE = '6'")


def test_without_hardware_the_status_has_zeros_and_no_network(road):
    road.write_problem("Something else", "A phone without hardware", "on a table")
    road.open_review()
    road.screen.activate("Device status")
    road.screen.wait_for("Copy")
    shown = road.screen.text("Device status", "entry")
    road.back()
    road.screen.activate("Send")
    road.has_seen_what_is_sent = True
    lines = device_status(road, "A phone without hardware")
    assert re.fullmatch(r"System Info - Build Version : .+, Screen width : 720, Screen height : 1280", lines[0])
    assert lines[1] == "Battery Info - Percent : 0, Battery Level : 0, Not Charging"
    assert re.fullmatch(r"Internal Memory - Total : [1-9]\d+ bytes, Available : \d+ bytes", lines[2])
    assert len(lines) == 3
    assert shown.splitlines()[:2] == lines[:2]


def test_battery_and_each_network_with_a_name_have_their_line(road, machine):
    machine.plug_in_battery()
    machine.set_battery(81.7, CHARGING)
    machine.plug_in_modems(MODEMS)
    road.write_problem("Something else", "A phone with hardware", "on a mast")
    road.send()
    lines = device_status(road, "A phone with hardware")
    assert lines[1] == "Battery Info - Percent : 81, Battery Level : 3, Charging"
    assert lines[3:] == [
        f"RSSI : 4, Network_info - Name : Net & Co RSSI : 6, Cell_Id : {0x2BAF41}, Status : 1, Service_State : 0, "
        f"LAC : {0x8BE3}",
        "RSSI : 0, Network_info - Name : Later, Cell_Id : 0, Status : 0, Service_State : 3, LAC : 0"]


def test_device_status_that_the_person_takes_off_stays_on_the_phone(road):
    road.write_problem("Something else", "Nothing of the phone", "please")
    road.open_review()
    for button in ("Remove", "Put back", "Remove"):
        road.screen.activate(button + " Device status")
    road.screen.wait_for("Put back Device status")
    road.screen.activate("Send")
    assert device_status(road, "Nothing of the phone") is None


def test_low_battery_saves_at_15_percent_and_anew_below_6(road, machine):
    machine.set_battery(30)
    road.write_problem("Something else", "Before the battery ends", "first")
    before = drafts(road.phone)

    def new_drafts():
        return [number for number in drafts(road.phone) if number not in before]

    def replaced(known):  # the new copy is stored before the old one goes
        found = new_drafts()
        return found if len(found) == 1 and found != known else None

    machine.set_battery(15)
    first, = wait_until(new_drafts, what="a draft at 15 percent")
    road.screen.type_text(HINT, "second")
    machine.set_battery(14)
    wait_until(lambda: "battery_capacity is [0] [14]" in road.phone.log(), what="14 percent being noticed")
    assert new_drafts() == [first]
    machine.set_battery(5)
    second, = wait_until(lambda: replaced([first]), what="a draft at 5 percent")
    assert second > first
    assert road.screen.text(HINT) == "second"
    road.send()
    assert road.arrived("Before the battery ends")["text"] == "second"
    assert new_drafts() == []
