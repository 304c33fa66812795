// docs/launch-requests.md beside the tables that the client works by.
#include <gmock/gmock.h>

#include <fstream>
#include <sstream>
#include <string>
#include <vector>

#include "tavro_launch_tables.h"

namespace {

using Rows = std::vector<std::vector<std::string>>;

std::string trimmed(const std::string &text) {
  const size_t first = text.find_first_not_of(" `"), last = text.find_last_not_of(" `");
  return first == text.npos ? "" : text.substr(first, last - first + 1);
}

// The first `columns` cells of each row of the table that follows a heading.
Rows documented(const std::string &heading, size_t columns) {
  std::ifstream document(TAVRO_LAUNCH_DOCUMENT);
  std::string line;
  while (std::getline(document, line) && line != heading) continue;
  while (std::getline(document, line) && line.rfind("|---", 0) != 0) continue;
  Rows rows;
  while (std::getline(document, line) && line.rfind("|", 0) == 0) {
    std::istringstream cells(line.substr(1));
    rows.emplace_back();
    for (std::string cell; rows.back().size() < columns && std::getline(cells, cell, '|');)
      rows.back().push_back(trimmed(cell));
  }
  return rows;
}

TEST(LaunchDocument, ListsWhatTheClientAcceptsInTheOrderOfItsTable) {
  Rows accepted;
  for (const tavro_accepted_operation &row : tavro_accepted_operations())
    accepted.push_back({row.operation ? row.operation : "any other", row.log_line ? row.log_line : ""});
  EXPECT_THAT(documented("## What the client accepts", 2), ::testing::ElementsAreArray(accepted));
}

TEST(LaunchDocument, ListsWhatTheClientSendsWithItsKeysInOrder) {
  Rows sent;
  for (const tavro_sent_operation &row : tavro_sent_operations()) {
    std::string keys;
    for (const char *key : row.keys) keys += std::string(keys.empty() ? "" : "`, `") + key;
    sent.push_back({row.operation, keys});
  }
  EXPECT_THAT(documented("## What the client sends", 2), ::testing::ElementsAreArray(sent));
}

}  // namespace
