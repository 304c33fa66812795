// What the client and the platform's crash service agree on: where the service is on the system bus, where it
// puts system logs, and what its answers carry. Both programs match these texts: never change them.
//
// Each "dump_log" is answered by one launch request to the client, in the order of the calls: with
// TAVRO_DUMP_LOG_FILE, or with TAVRO_DUMP_LOG_ERROR when there is no log.
#pragma once

constexpr char TAVRO_CRASH_SERVICE[] = "org.tizen.system.crash";
constexpr char TAVRO_CRASH_SERVICE_PATH[] = "/Org/Tizen/System/Crash/Crash";
constexpr char TAVRO_CRASH_SERVICE_INTERFACE[] = "org.tizen.system.crash.Crash";

constexpr char TAVRO_DUMP_LOG_OPERATION[] = "DUMP_LOG_PROCESS";
constexpr char TAVRO_DUMP_LOG_FILE[] = "TAVRO_DUMP_LOG_FILE";    // file name in the folder below
constexpr char TAVRO_DUMP_LOG_ERROR[] = "TAVRO_DUMP_LOG_ERROR";  // why, for the platform log

constexpr char TAVRO_LOG_DUMP_FOLDER[] = "/opt/usr/media/QRT_debug/";
