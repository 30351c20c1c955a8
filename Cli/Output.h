#pragma once

/// What the commands print: tables and sentences for people, JSON for scripts.
///
/// Names, files and servers choose part of the text: none of it reaches the terminal unless it is printable, in JSON neither.
/// Colours follow habit: never with `NO_COLOR` (no-color.org) or TERM=dumb, otherwise on a terminal.
/// Threads: one. Errors: none.

#include <string>
#include <string_view>
#include <vector>

#include "Cli/AccountsClient.h"

namespace palisade {

enum class Colour { automatic, always, never };

/// A column of a listing: its heading, and the key of the row that it shows. Times are shown as local time.
struct Column {
  std::string heading;
  std::string key;
  enum class Kind { plain, time, yesNo } kind = Kind::plain;
};

class Output {
 public:
  void setJson(bool isJson) { _isJson = isJson; }
  void setColour(Colour colour) { _colour = colour; }
  bool isJson() const { return _isJson; }

  /// Rows as a table, or `whenEmpty` when there are none; as an array of objects with JSON.
  void list(const Rows& rows, const std::vector<Column>& columns, std::string_view whenEmpty) const;

  /// A sentence; with JSON the object instead.
  void say(std::string_view sentence, const Dictionary& object) const;

  bool isColoured() const;

 private:
  bool _isJson = false;
  Colour _colour = Colour::automatic;
};

/// A value on one line: lists by commas, nothing for a missing one.
std::string shown(const Value* value);

}  // namespace palisade
