// What window applications and services have in common: their identity, their place on the phone's bus, the
// requests that arrive there, and the orderly end. Main loop only.
//
//   claim() -> requests arrive on the default GLib main context -> leave()
//
// leave() gives the name back first, so that the bus starts a new instance for whatever comes later, then
// serves what had arrived until then; so no request falls between the two.
#pragma once

#include <app_control.h>

#include <functional>
#include <string>

namespace platform {

// The application id: the file name of this process's program.
const std::string &application_id();
// The folder above the program's folder, without a slash at the end.
const std::string &application_folder();

using LaunchHandler = std::function<void(app_control_h)>;

enum class Claim {
  kOwner,      // this process is the application now
  kForwarded,  // another instance runs and has been told of this start
  kFailed,     // no bus
};

// `lost` runs on the main loop when the bus goes away: the application should end.
Claim claim_application(LaunchHandler handler, std::function<void()> lost);

// Whether nobody else will send the first launch request, because a person or a script started the program.
bool is_started_by_hand();

// A launch request of the default operation, as the home screen sends it.
void deliver_default_launch();

// `refuse`: requests that had arrived are answered with an error instead of being served.
void leave_application(bool refuse);

}  // namespace platform
