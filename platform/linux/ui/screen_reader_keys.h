// Keys while a screen reader may listen. The toolkit's accessibility bridge takes every key out of the loop,
// asks the accessibility registry whether a screen reader consumes it, and drops it whatever the answer. So
// keys are taken before the bridge knows of them, the registry is asked from here without waiting, and what
// no screen reader consumed goes on to the hardware keys' listeners and the toolkit, each once and in the
// order in which it came. In an application without the bridge keys pass untouched.
//
// The registry has half a second for each key; without an answer, or without a registry, the key goes on.
// Handlers of ecore's key events other than those of this library and the canvas do not see keys that went
// this way. Main loop only.
#pragma once

namespace platform {

// Between the toolkit's start and its main loop: the bridge steps in when the loop runs.
void share_keys_with_screen_reader();

// Drops what is still waiting for an answer.
void stop_sharing_keys();

}  // namespace platform
