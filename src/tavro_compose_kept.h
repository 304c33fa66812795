// What is kept of a compose screen, and the files that hold it: one for each screen that ended without its
// content being stored or discarded, so that none takes another's place. Their keys are read by later
// versions of the client: append-only; unknown ones are passed over. Main loop only.
#pragma once

#include <optional>
#include <set>
#include <string>
#include <vector>

#include "tavro-main.h"
#include "tavro_dbmgr.h"
#include "tavro_handles.h"

struct kept_writing {
  reportType type = PROBLEM;  // PROBLEM, CRASH or IDEA
  // `id` is that of the draft the screen was opened from, 0 for none; `type` and the dates are not kept.
  TavroHandle<svc_voc_data, tavro_dbmgr_free_voc_data> content;
  int auto_saved_id = 0;  // of the automatic copy, 0 for none
  bool is_device_status_removed = false;
  gint64 begun = 0;  // seconds since the epoch: when the screen was opened
};

// The bytes of a file.
std::string tavro_kept_data(const kept_writing &kept);

// Nothing when the file is missing; when it is damaged or says nothing: then it is set aside; and when it
// cannot be read now: then it stays. The last two with a log line.
std::optional<kept_writing> tavro_kept_load(const std::string &path);

// The content is stored or discarded.
void tavro_kept_remove(const std::string &path);

// The files that are there, in the order of their places.
std::vector<std::string> tavro_kept_paths();
// A path for one more; empty when there are too many.
std::string tavro_kept_unused_path();

// Paths of the attachments, logs and dumps that the kept files and the open screen name: none of them may go.
// Nothing when one of the kept files cannot be read now.
std::optional<std::set<std::string>> tavro_kept_attached_files();

// What a person wrote or attached. A log that came by itself, or a target alone, is no loss.
bool tavro_kept_says_something(const kept_writing &kept);

// Whether the store holds it as a report of its own already: the same content, stored since the screen was
// opened.
bool tavro_kept_is_stored(const kept_writing &kept);
// Forget the draft it was opened from and the automatic copy where they are no drafts of this person any
// more, so that nothing else is removed in their place.
void tavro_kept_check_drafts(kept_writing *kept);

// The open screen shows what this file holds, and nothing of it is stored: the screen goes on keeping it
// there.
void tavro_compose_keeper_take_over(const std::string &path);
