// Cuts long texts into parts that the toolkit can lay out without a pause. Plain logic, any thread.
#pragma once

#include <string>
#include <vector>

// Parts of at most `limit` bytes (4 at least) that add up to the text. A part ends behind a line where there
// is one to end behind, never within a character. An empty text is one empty part.
std::vector<std::string> tavro_text_parts(const std::string &text, size_t limit);
