#include "usage_hints.h"

#include <CLI/CLI.hpp>

#include <algorithm>
#include <vector>

namespace stbtool {
namespace {

// Edits further than this are no longer a typo of the command.
constexpr size_t kMaxEdits = 2;

size_t EditDistance(const std::string& a, const std::string& b) {
  std::vector<size_t> row(b.size() + 1);
  for (size_t j = 0; j <= b.size(); ++j) row[j] = j;
  for (size_t i = 1; i <= a.size(); ++i) {
    size_t diagonal = row[0];
    row[0] = i;
    for (size_t j = 1; j <= b.size(); ++j) {
      const size_t above = row[j];
      row[j] = std::min({row[j] + 1, row[j - 1] + 1, diagonal + (a[i - 1] == b[j - 1] ? 0 : 1)});
      diagonal = above;
    }
  }
  return row[b.size()];
}

}  // namespace

const CLI::App& InnermostCommand(const CLI::App& app) {
  for (const CLI::App* sub : app.get_subcommands())
    if (sub->parsed()) return InnermostCommand(*sub);
  return app;
}

std::string CommandNames(const CLI::App& app) {
  std::string names;
  for (const CLI::App* sub : app.get_subcommands({}))
    names += (names.empty() ? "" : ", ") + sub->get_name();
  return names;
}

std::string NearestCommand(const CLI::App& app, const std::string& word) {
  std::string nearest;
  size_t best = kMaxEdits + 1;
  for (const CLI::App* sub : app.get_subcommands({})) {
    const std::string& name = sub->get_name();
    const size_t edits = name.compare(0, word.size(), word) == 0 && !word.empty() ? 0 : EditDistance(word, name);
    if (edits < best) {
      best = edits;
      nearest = name;
    }
  }
  return nearest;
}

}  // namespace stbtool
