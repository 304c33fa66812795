// Presses keys on the display as a keyboard does: each argument is a key's name, with modifiers in front
// ("Tab", "Shift_L+Tab", "a").
#include <Ecore_X.h>

#include <cstdio>
#include <sstream>
#include <string>
#include <vector>

namespace {

bool press(const std::string &combination) {
  std::vector<std::string> keys;
  std::istringstream parts(combination);
  for (std::string key; std::getline(parts, key, '+');) keys.push_back(key);
  bool is_pressed = !keys.empty();
  for (auto key = keys.begin(); key != keys.end(); ++key)
    is_pressed &= ecore_x_test_fake_key_down(key->c_str()) != EINA_FALSE;
  for (auto key = keys.rbegin(); key != keys.rend(); ++key) ecore_x_test_fake_key_up(key->c_str());
  ecore_x_sync();
  return is_pressed;
}

}  // namespace

int main(int argc, char **argv) {
  if (!ecore_x_init(nullptr)) return std::fprintf(stderr, "no display\n"), 1;
  bool is_done = true;
  for (int i = 1; i < argc; ++i) is_done &= press(argv[i]);
  ecore_x_shutdown();
  return is_done ? 0 : 1;
}
