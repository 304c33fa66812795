// The phone's own feedback desk: where it keeps its data, which port it has, how it is started.
#pragma once

#include <optional>
#include <string>
#include <vector>

#include "folder.h"

namespace phone {

// The port on the loopback: the one of the last start where it is still free, else a free one, kept for the
// next start. Nothing with a message when there is none.
std::optional<int> choose_desk_port(const Folder &folder);

std::vector<std::string> desk_command(const Folder &folder, int port);
std::string desk_url(int port);

}  // namespace phone
