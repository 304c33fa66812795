// The GLib main context inside ecore's main loop: D-Bus and everything else that GIO does is served while
// ecore waits. Main loop only.
#pragma once

namespace platform {

void merge_glib_into_ecore();
// Back to ecore's own wait; before ecore is shut down.
void separate_glib_from_ecore();

}  // namespace platform
