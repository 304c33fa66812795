// The phone's accounts, as the account choice offers them.
//
// tavro_find_mail_id opens the account store and leaves it open; the caller closes it with
// tavro_account_disconnect_db when the page is served. Main loop only.
#pragma once

#include <glib.h>

// One account; texts are tracked and may be null.
struct tavro_account_info {
  char *user_name;
  char *email;
  char *display_name;
  char *package;
  char *domain;
  char *icon;  // path of an image
};

// A new list of tavro_account_info in the order of the account store; null when there is none or the store
// cannot be read. Free it with tavro_free_account_list.
GSList *tavro_find_mail_id();
void tavro_free_account_list(GSList *accounts);

// The maker's account in the list (it stays the list's); null when it is not there.
const tavro_account_info *tavro_check_corvane_account_in_list(const GSList *accounts);

// Close the account store; nothing when it is not open.
void tavro_account_disconnect_db();
