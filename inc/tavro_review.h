// What is sent with the open report, as a list: the plain logic behind the page "What is sent". The facts are
// copies, so the list can be made, compared and tested without a window. Main loop only.
#pragma once

#include <glib.h>

#include <string>
#include <vector>

#include "tavro_system_log.h"

struct appdata;

// What is known of the open compose screen. Texts are plain UTF-8; empty: there is none.
struct tavro_review_facts {
  std::string target;  // as a person reads it
  std::string title, description;
  std::vector<std::string> attachments;  // paths
  bool is_problem = false;               // an idea carries none of what follows but the account
  std::string dump_path;
  std::string log_path;
  tavro_system_log_state log_state = TAVRO_SYSTEM_LOG_OFF;
  bool is_log_mandatory = false;
  std::string device_status;  // empty: not read yet
  bool is_device_status_removed = false;
  std::string account;
};

enum tavro_review_kind {
  TAVRO_REVIEW_TEXT,
  TAVRO_REVIEW_PICTURE,
  TAVRO_REVIEW_VIDEO,
  TAVRO_REVIEW_DUMP,
  TAVRO_REVIEW_LOG,
  TAVRO_REVIEW_DEVICE_STATUS,
  TAVRO_REVIEW_ACCOUNT,
};

enum tavro_review_action {
  TAVRO_REVIEW_KEEP,  // it cannot be taken off
  TAVRO_REVIEW_REMOVE,
  TAVRO_REVIEW_PUT_BACK,
};

struct tavro_review_item {
  tavro_review_kind kind;
  std::string title, detail;
  std::string path;  // of a file
  gint64 size;       // bytes that go out, 0 when nothing of it does
  bool is_sent;
  bool can_open;
  tavro_review_action action;
};

// The facts of the open compose screen, without the device status, which takes its time to read. No screen:
// no facts.
tavro_review_facts tavro_review_facts_of(appdata *ad);

// In the order of the page. Looks at the files as they are now.
std::vector<tavro_review_item> tavro_review_items(const tavro_review_facts &facts);

// "6 items, 1.6 MB": what goes out in all.
std::string tavro_review_total(const std::vector<tavro_review_item> &items);

// What is behind the item "Your text": target, title and description as typed.
std::string tavro_review_text(const tavro_review_facts &facts);
