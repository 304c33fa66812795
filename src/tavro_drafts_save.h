// The two savers with the choice of what becomes of the compose screen when the store refuses the report.
#pragma once

struct appdata;

enum class on_failed_store {
  end_screen,   // release the view; the save journal keeps the report where it could be written
  keep_screen,  // leave everything as it was typed, so that the person can try again
};

int tavro_drafts_save_problem(appdata *ad, int status, on_failed_store failed);
int tavro_drafts_save_idea(appdata *ad, int status, on_failed_store failed);
