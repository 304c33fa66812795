// Locale and translated texts of the shell utilities.
#include <app.h>
#include <libintl.h>

#include <clocale>
#include <cstdlib>
#include <cstring>
#include <string>

#include "tavro-common.h"
#include "tavro_memory.h"

namespace {

constexpr char kTextDomain[] = "tavro-lite";

// The texts are string ids, so English too is a translation: it is what every language falls back to. The
// plain "C" locale would switch translation off altogether.
bool _select_languages() {
  if (!std::setlocale(LC_ALL, "")) std::setlocale(LC_ALL, "C.UTF-8");
  const char *messages = std::setlocale(LC_MESSAGES, nullptr);
  if (!messages || std::strcmp(messages, "C") == 0 || std::strcmp(messages, "POSIX") == 0)
    if (!std::setlocale(LC_ALL, "C.UTF-8")) return false;
  static const char *const chosen = std::getenv("LANGUAGE");
  static const std::string own_choice = chosen ? chosen : "";
  std::string languages = own_choice;
  if (languages.empty()) languages = std::string(std::setlocale(LC_MESSAGES, nullptr)).substr(0, 2);
  languages += ":en";
  const char *current = std::getenv("LANGUAGE");
  return (current && languages == current) || setenv("LANGUAGE", languages.c_str(), 1) == 0;
}

}  // namespace

int tavro_bind_locale() {
  static const std::string folder = [] {
    const TavroText resources(TAVRO_ADOPT(app_get_resource_path()));
    return std::string(resources ? resources.get() : "") + "locale";
  }();
  if (!_select_languages()) return -1;
  if (!bindtextdomain(kTextDomain, folder.c_str())) return -1;
  return bind_textdomain_codeset(kTextDomain, "UTF-8") ? 0 : -1;
}

const char *tavro_text(const char *id) {
  return id && *id ? dgettext(kTextDomain, id) : id;
}
