// What a return to the client means for the page on top: the person may come back from the platform's account
// settings. Main loop only.
#pragma once

struct appdata;

// Decide by the title of the naviframe's top page; nothing without one.
void tavro_resume_top_page(appdata *ad);
