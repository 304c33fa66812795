#include "tavro_crash_rules.h"

#include <algorithm>
#include <charconv>
#include <cstring>
#include <string_view>
#include <vector>

#include "tavro_handles.h"

namespace {

constexpr gint64 kDay = 24 * 60 * 60 * G_GINT64_CONSTANT(1000);
constexpr gint64 kWeek = 7 * kDay;
constexpr size_t kReadBytes = 4096;   // of a text from the bus, however long it is
constexpr size_t kLongestName = 255;  // characters, of a name or an id
constexpr size_t kLongestShown = 60;  // characters
constexpr size_t kLongestFolder = 255;
constexpr size_t kMostTimes = 99;
constexpr size_t kMostApplications = 50;
constexpr size_t kMostListed = 500;

struct app_times {
  std::string app_id;
  std::vector<gint64> times;  // in order, each once
};

// What is neither to be seen nor needed for writing: it could break lines or turn the text around.
bool _is_hidden(gunichar letter) {
  constexpr gunichar kNonJoiner = 0x200C, kJoiner = 0x200D;
  return g_unichar_type(letter) == G_UNICODE_FORMAT && letter != kJoiner && letter != kNonJoiner;
}

// The text on one line, without blanks around it and with an ellipsis where it is cut.
std::string _one_line(const char *text, size_t most_characters) {
  if (!text) return {};
  const TavroGText valid(g_utf8_make_valid(text, static_cast<gssize>(strnlen(text, kReadBytes))));
  std::string line;
  size_t characters = 0;
  bool has_gap = false;
  for (const char *at = valid.get(); *at; at = g_utf8_next_char(at)) {
    const gunichar letter = g_utf8_get_char(at);
    const bool is_gap = g_unichar_isspace(letter) || g_unichar_iscntrl(letter);
    has_gap = has_gap || (is_gap && !line.empty());
    if (is_gap || _is_hidden(letter)) continue;
    if (characters + 1 >= most_characters) return line + "\u2026";
    if (has_gap) line += ' ';
    characters += has_gap ? 2 : 1;
    has_gap = false;
    line.append(at, static_cast<size_t>(g_utf8_next_char(at) - at));
  }
  return line;
}

std::optional<gint64> _number(std::string_view text) {
  gint64 number = 0;
  const auto parsed = std::from_chars(text.data(), text.data() + text.size(), number);
  if (parsed.ec != std::errc() || parsed.ptr != text.data() + text.size()) return std::nullopt;
  return number;
}

bool _is_of_last_week(gint64 time, gint64 now) {
  return time <= now && time > now - kWeek;
}

std::string _folder_name(const char *folder) {
  if (!folder || !*folder || strnlen(folder, kLongestFolder + 1) > kLongestFolder) return {};
  if (std::strchr(folder, '/') || std::strcmp(folder, ".") == 0 || std::strcmp(folder, "..") == 0) return {};
  return folder;
}

std::vector<std::string> _split(const std::string &text, char separator) {
  std::vector<std::string> parts;
  for (size_t begin = 0; begin < text.size();) {
    const size_t end = std::min(text.find(separator, begin), text.size());
    if (end > begin) parts.push_back(text.substr(begin, end - begin));
    begin = end + 1;
  }
  return parts;
}

// What is damaged or older than a week is left out.
std::vector<app_times> _read_times(const std::string &text, gint64 now) {
  std::vector<app_times> apps;
  for (const std::string &line : _split(text, '\n')) {
    const std::vector<std::string> columns = _split(line, '\t');
    if (columns.size() != 2) continue;
    app_times app{columns[0], {}};
    for (const std::string &word : _split(columns[1], ' ')) {
      const std::optional<gint64> time = _number(word);
      if (time && _is_of_last_week(*time, now)) app.times.push_back(*time);
    }
    if (!app.times.empty()) apps.push_back(std::move(app));
  }
  return apps;
}

std::string _write_times(const std::vector<app_times> &apps) {
  std::string text;
  for (const app_times &app : apps) {
    text += app.app_id + '\t';
    for (const gint64 time : app.times) text += std::to_string(time) + ' ';
    text.back() = '\n';
  }
  return text;
}

template <typename Element>
void _drop_first(std::vector<Element> *elements, size_t most) {
  if (elements->size() > most) elements->erase(elements->begin(), elements->end() - static_cast<long>(most));
}

std::string _join(const std::vector<std::string> &ids) {
  std::string list;
  for (const std::string &id : ids) list += id + '\n';
  return list;
}

}  // namespace

std::optional<tavro_crash> tavro_crash_read(const char *app_id, const char *app_name, const char *time,
                                            const char *folder, gint64 now) {
  tavro_crash crash{_one_line(app_id, kLongestName), _one_line(app_name, kLongestName), _folder_name(folder),
                    now};
  if (crash.app_id.empty()) crash.app_id = crash.app_name;
  if (crash.app_name.empty()) crash.app_name = crash.app_id;
  if (crash.app_id.empty()) return std::nullopt;
  const std::optional<gint64> told =
      time ? _number(std::string_view(time, strnlen(time, kReadBytes))) : std::nullopt;
  if (told && _is_of_last_week(*told, now)) crash.time = *told;
  return crash;
}

std::string tavro_crash_short_name(const std::string &app_name) {
  return _one_line(app_name.c_str(), kLongestShown);
}

bool tavro_crash_was_asked_lately(const char *asked, gint64 now) {
  const std::optional<gint64> time = asked ? _number(asked) : std::nullopt;
  return time && *time <= now && *time > now - kDay;
}

int tavro_crash_count(std::string *times, const tavro_crash &crash, gint64 now) {
  std::vector<app_times> apps = _read_times(*times, now);
  app_times crashed{crash.app_id, {}};
  const auto known = std::find_if(apps.begin(), apps.end(),
                                  [&](const app_times &app) { return app.app_id == crash.app_id; });
  if (known != apps.end()) {
    crashed = *known;
    apps.erase(known);
  }
  crashed.times.push_back(crash.time);
  std::sort(crashed.times.begin(), crashed.times.end());
  crashed.times.erase(std::unique(crashed.times.begin(), crashed.times.end()), crashed.times.end());
  _drop_first(&crashed.times, kMostTimes);
  const auto count = static_cast<int>(crashed.times.size());
  apps.push_back(std::move(crashed));
  _drop_first(&apps, kMostApplications);
  *times = _write_times(apps);
  return count;
}

bool tavro_crash_list_has(const std::string &list, const std::string &app_id) {
  const std::vector<std::string> ids = _split(list, '\n');
  return std::find(ids.begin(), ids.end(), app_id) != ids.end();
}

std::string tavro_crash_list_with(const std::string &list, const std::string &app_id) {
  std::vector<std::string> ids = _split(tavro_crash_list_without(list, app_id), '\n');
  ids.push_back(app_id);
  _drop_first(&ids, kMostListed);
  return _join(ids);
}

std::string tavro_crash_list_without(const std::string &list, const std::string &app_id) {
  std::vector<std::string> ids = _split(list, '\n');
  ids.erase(std::remove(ids.begin(), ids.end(), app_id), ids.end());
  return _join(ids);
}

std::string tavro_crash_archive_name(const std::string &folder) {
  const size_t last = folder.rfind('_');
  return "tavro_" + (last == std::string::npos ? folder : folder.substr(last + 1)) + ".zip";
}
