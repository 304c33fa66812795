// The end of an account's use on this phone. Reports stay in the store under their owner's name and come back
// when that name is chosen again; what only the account may see goes: its stored sign-in and cookies, its
// notifications, the number on the icon and every open page.
//
// Main loop only.
#pragma once

struct appdata;

// Sign the person out. A deletion that waits is finished; what is being written becomes a draft of its owner.
// Afterwards the account page is the only page (the window is built when there is none) and says why it is
// there. Does nothing more than the storing and removing once the application is ending.
void tavro_sign_out(appdata *ad);
