// Objects of the machine's services, read with a short time limit. Main loop only.
#pragma once

#include "bus.h"

namespace platform {

// A call on a service of the machine's system bus; null when the bus, the service or the object is not there
// (which is no fault and not logged). A service that let a call run into the time limit counts as absent for
// five seconds.
ScopedVariant call_host_service(const char *service, const char *path, const char *interface,
                                const char *method, GVariant *arguments, const char *reply_type);

// One entry of a dictionary a{sv}, when it is there and has that type.
ScopedVariant lookup(GVariant *dictionary, const char *key, const GVariantType *type);

}  // namespace platform
