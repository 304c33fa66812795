// Pictures in a format that support may not be able to open (WebP) go as a JPEG copy in the folder of
// generated files, which takes the place of the attached picture as soon as it is there: until then, drafts
// and what is kept of the screen hold the picture itself. Main loop only; the copy is made on a worker.
#pragma once

struct appdata;

// Have a copy made of each such picture on the open compose screen; whether any is still to come. A picture
// that cannot be converted is taken off the screen, with the reason in a popup.
bool tavro_compose_convert(appdata *ad);
