// What the phone's hardware keys do, for whoever delivers keys past ecore's own handlers. Main loop only.
#pragma once

#include <Ecore_Input.h>

namespace platform {

// A key went down: true when it belongs to the application as a hardware key, and the toolkit must not see
// it.
bool take_key_down(const Ecore_Event_Key &key);

// A key came up: serves whoever asked for it. The toolkit may see it too.
void serve_key_up(const Ecore_Event_Key &key);

}  // namespace platform
