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

// A crash of an application is told to the client by one launch request, once its crash folder is whole.
constexpr char TAVRO_CRASH_OPERATION[] = "CRASH_PROCESS";
constexpr char TAVRO_CRASH_APP_ID[] =
    "TAVRO_CRASH_APP_ID";  // or the program's name, of what is no application
constexpr char TAVRO_CRASH_APP_NAME[] = "TAVRO_CRASH_APP_NAME";  // as people know it
constexpr char TAVRO_CRASH_TIME[] = "TAVRO_CRASH_TIME";          // milliseconds since the epoch
constexpr char TAVRO_CRASH_FOLDER[] = "TAVRO_CRASH_FOLDER";      // name of the crash folder

constexpr char TAVRO_CRASH_DUMP_FOLDER[] = "/opt/usr/share/crash/dump/";
constexpr char TAVRO_LOG_DUMP_FOLDER[] = "/opt/usr/media/QRT_debug/";
