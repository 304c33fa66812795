// What a recording that failed has left behind.
#pragma once

// Cut off what follows the last whole fragment of the MP4 file. False when there is no whole one.
bool cut_to_whole_fragments(int fd);
