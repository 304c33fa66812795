// Desktop entries as the descriptions of installed applications.
#pragma once

#include <gio/gdesktopappinfo.h>

#include <string>

#include "scoped.h"

namespace platform {

// The entry of an application or package id (without ".desktop"): beside the phone's own applications first,
// then in the machine's folders. Null when there is none.
ScopedObject<GDesktopAppInfo> find_desktop_entry(const std::string &id);

}  // namespace platform
