#!/usr/bin/python3
"""Plays ModemManager on the system bus: prints "ready", then serves until it is killed. The argument is a JSON list
of modems: {"path", "signal" (percent), "state", "location", and for one with a 3GPP network "registration" and
"name"}. What is left out is not there, as with a real modem that does not know."""

import json
import sys

import dbus
import dbus.mainloop.glib
import dbus.service
from gi.repository import GLib

NAME = "org.freedesktop.ModemManager1"
MODEM = NAME + ".Modem"


class Modem(dbus.service.Object):
    def __init__(self, bus, facts):
        self.facts = facts
        self.path = f"/org/freedesktop/ModemManager1/Modem/{facts['path']}"
        super().__init__(bus, self.path)

    def interfaces(self):
        facts = self.facts
        quality = dbus.Struct((dbus.UInt32(facts["signal"]), True), signature="ub")
        interfaces = {MODEM: {"State": dbus.Int32(facts["state"]), "SignalQuality": quality}}
        if "registration" in facts:
            network = {"RegistrationState": dbus.UInt32(facts["registration"])}
            if "name" in facts:
                network["OperatorName"] = facts["name"]
            interfaces[MODEM + ".Modem3gpp"] = network
        return interfaces

    @dbus.service.method(MODEM + ".Location", out_signature="a{uv}")
    def GetLocation(self):
        return {dbus.UInt32(1): self.facts["location"]} if "location" in self.facts else {}


class Manager(dbus.service.Object):
    def __init__(self, bus, modems):
        super().__init__(bus, "/org/freedesktop/ModemManager1")
        self.modems = [Modem(bus, facts) for facts in modems]

    @dbus.service.method("org.freedesktop.DBus.ObjectManager", out_signature="a{oa{sa{sv}}}")
    def GetManagedObjects(self):
        return {modem.path: modem.interfaces() for modem in self.modems}


dbus.mainloop.glib.DBusGMainLoop(set_as_default=True)
system_bus = dbus.SystemBus()
manager = Manager(system_bus, json.loads(sys.argv[1]))
name = dbus.service.BusName(NAME, system_bus, do_not_queue=True)
print("ready", flush=True)
GLib.MainLoop().run()
