#pragma once

/// Tables for people: columns line up, whatever script they are written in.
///
/// Threads: a value, used by one thread. Errors: none; what is not printable shows as U+FFFD (Host/Text/PrintableText.h).

#include <string>
#include <vector>

namespace palisade {

class Table {
 public:
  explicit Table(std::vector<std::string> headings) : _headings(std::move(headings)) {}

  /// As many cells as there are headings.
  void add(std::vector<std::string> cells) { _rows.push_back(std::move(cells)); }
  bool empty() const { return _rows.empty(); }

  /// The table's lines, each with a line end; headings in bold with `isColoured`.
  std::string text(bool isColoured) const;

 private:
  std::vector<std::string> _headings;
  std::vector<std::vector<std::string>> _rows;
};

}  // namespace palisade
