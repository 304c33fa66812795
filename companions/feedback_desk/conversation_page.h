// The part of a report's page that reads as a conversation: what the person wrote and attached, the answers
// of support, and the person's follow-ups, in the order of their times; and the first bytes of stored files,
// which decide how a file is shown.
#pragma once

#include <string>
#include <vector>

#include "desk.h"

std::string conversation_html(Desk &desk, const DeskReport &report, const std::vector<DeskAttachment> &files);

// The link from a follow-up to the report that it names; empty for any other report.
std::string first_report_html(Desk &desk, const DeskReport &report);

// What a follow-up says of the report that it names, in the words that the person chose.
std::string verdict_text(const std::string &verdict, const DeskReport &first);

// The page path of a report, and of a file of a report.
std::string report_path(int64_t report);
std::string file_path(const DeskReport &report, const DeskAttachment &file);

// The first bytes of a stored file, and the type that they tell.
std::string file_start(const Desk &desk, int64_t report, int64_t number, int64_t most_bytes);
const char *file_type(const Desk &desk, int64_t report, int64_t number);
