// What the core handler (tavro-core-handler) and the crash service agree on: where cores lie and what is
// written beside each as extended attributes. The first group has the names that systemd-coredump uses for
// its own cores, so that one reader understands both; the texts are on people's disks: never change them.
#pragma once

constexpr char TAVRO_CORE_HOME[] =
    "/var/lib/tavro-phone";  // root's; the handler's copy and state lie here too
constexpr char TAVRO_CORE_FOLDER[] = "/var/lib/tavro-phone/cores";
constexpr char TAVRO_SYSTEM_CORE_FOLDER[] = "/var/lib/systemd/coredump";

constexpr char TAVRO_CORE_PID[] = "user.coredump.pid";  // as the machine counts
constexpr char TAVRO_CORE_UID[] = "user.coredump.uid";
constexpr char TAVRO_CORE_SIGNAL[] = "user.coredump.signal";
constexpr char TAVRO_CORE_TIME[] = "user.coredump.timestamp";  // microseconds since the epoch
constexpr char TAVRO_CORE_PROGRAM[] = "user.coredump.comm";
constexpr char TAVRO_CORE_EXECUTABLE[] = "user.coredump.exe";

constexpr char TAVRO_CORE_PHONE[] =
    "user.coredump.tavro.phone";  // folder of the phone that it ran in, or absent
constexpr char TAVRO_CORE_PHONE_PID[] = "user.coredump.tavro.pid";  // as its own process namespace counts
constexpr char TAVRO_CORE_NOTE[] = "user.coredump.tavro.note";      // why the core is not whole, or absent
