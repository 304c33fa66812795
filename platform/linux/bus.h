// The message buses: the phone's own, which plays its session and its system bus, and the machine's, where
// the desktop's services live. On a machine whose own bus is not given, its place is taken by the phone's
// bus, so that a phone without a desktop can bring services of its own.
//
// Connections are made at first use and kept. Main loop only, except phone_bus().
#pragma once

#include <gio/gio.h>

#include <functional>
#include <string>

#include "scoped.h"

namespace platform {

constexpr int kServiceTimeoutMs = 500;  // for services that may be absent or stuck
constexpr int kNoTimeLimit = G_MAXINT;
constexpr const char *kBusName = "org.freedesktop.DBus";
constexpr const char *kBusPath = "/org/freedesktop/DBus";

// The phone's bus, null (with one log line) when the process runs outside a phone. Borrowed. The process does
// not end when the bus goes away; app_core cares for that.
GDBusConnection *phone_bus();

enum class HostBus { kSession, kSystem };

// A connection to the machine's bus, waiting half a second at most; null when there is none. Borrowed. After
// a failure the next five seconds fail at once.
GDBusConnection *host_bus(HostBus kind);

// Run `use` on the main loop once the connection is there; with null when there is none. Does not block.
void with_host_bus(HostBus kind, std::function<void(GDBusConnection *)> use);

// Work that has still to go out: a process that ends waits for it in finish_outgoing(), two seconds at most,
// and then until everything written is on its way.
void hold_end();
void release_end();
void finish_outgoing();
// Only what is written to the phone's bus already.
void flush_phone_bus();

// A call on the phone's bus daemon itself; null on failure, with the error in `error`.
ScopedVariant call_bus_daemon(const char *method, GVariant *arguments, const char *reply_type,
                              ErrorSlot *error);

}  // namespace platform
