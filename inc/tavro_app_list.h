// The applications installed on the phone, as the platform tells them, and the store's table of them.
//
// The platform is the truth: what a person chooses from is read from it, on a worker, each time. The table
// serves look-ups without a display, such as an application's id by its name; it is brought into step with
// each list that was read, one commit at a time and with pauses, so that nobody waits for it. It may
// therefore be empty or behind. Main loop only, unless said otherwise.
#pragma once

#include <string>
#include <vector>

struct tavro_application {
  std::string id, package;
  std::string name;    // in the person's language
  std::string icon;    // path of a picture; empty: none
  bool is_downloaded;  // installed by the person, not with the phone
};

// In no order. Any thread; takes tens of milliseconds.
std::vector<tavro_application> tavro_app_list_read();

// Sort by name as the person's language does; without a language, without regard to case and accents.
void tavro_app_list_sort(std::vector<tavro_application> &applications);

// Read on a worker and hand over once, sorted. The result is the handle for giving up, valid until then.
using tavro_app_list_read_cb = void (*)(void *data, std::vector<tavro_application> applications);
struct tavro_app_list_reading;
tavro_app_list_reading *tavro_app_list_read_later(tavro_app_list_read_cb read, void *data);
void tavro_app_list_give_up(tavro_app_list_reading *reading);

// What the table must lose and gain; an application that changed does both. Any thread.
struct tavro_app_list_changes {
  std::vector<std::string> gone_packages;
  std::vector<tavro_application> added;
};
tavro_app_list_changes tavro_app_list_compare(const std::vector<tavro_application> &stored,
                                              const std::vector<tavro_application> &installed);

// Bring the table into step with a list that was read. Begins after a pause; a later list replaces what is
// left.
void tavro_app_list_store(std::vector<tavro_application> installed);
// The same with a list of its own, some seconds from now: for the start of the client.
void tavro_app_list_store_soon();
