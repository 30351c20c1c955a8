#include "Cli/Output.h"

#include <fmt/chrono.h>
#include <fmt/core.h>
#include <unistd.h>

#include <cstdlib>

#include "Cli/Table.h"
#include "Host/Text/PrintableText.h"
#include "Platform/Format.h"

namespace palisade {
namespace {

std::string cellOf(const Dictionary& row, const Column& column) {
  const Value* value = row.find(column.key);
  if (value == nullptr) return "–";
  switch (column.kind) {
    case Column::Kind::yesNo: return value->boolean() != nullptr && *value->boolean() ? "yes" : "no";
    case Column::Kind::time:
      if (const std::int64_t* time = value->integer()) return fmt::format("{:%Y-%m-%d %H:%M:%S}", fmt::localtime(*time));
      break;
    case Column::Kind::plain: break;
  }
  return shown(value);
}

}  // namespace

std::string shown(const Value* value) {
  if (value == nullptr) return "";
  const Array* array = value->array();
  if (array == nullptr) return describe(*value);
  std::string text;
  for (const Value& element : *array) {
    if (!text.empty()) text += ", ";
    text += describe(element);
  }
  return text;
}

bool Output::isColoured() const {
  if (_colour != Colour::automatic) return _colour == Colour::always;
  const char* noColour = std::getenv("NO_COLOR");
  const char* terminal = std::getenv("TERM");
  const bool isDumb = terminal == nullptr || std::string_view(terminal) == "dumb";
  return (noColour == nullptr || *noColour == '\0') && !isDumb && isatty(STDOUT_FILENO) == 1;
}

void Output::list(const Rows& rows, const std::vector<Column>& columns, std::string_view whenEmpty) const {
  if (_isJson) {
    fmt::print("{}\n", printableJson(compactJson(Array(rows.begin(), rows.end()))));
    return;
  }
  if (rows.empty()) {
    fmt::print("{}\n", whenEmpty);
    return;
  }
  std::vector<std::string> headings;
  headings.reserve(columns.size());
  for (const Column& column : columns) headings.push_back(column.heading);
  Table table(std::move(headings));
  for (const Dictionary& row : rows) {
    std::vector<std::string> cells;
    cells.reserve(columns.size());
    for (const Column& column : columns) cells.push_back(cellOf(row, column));
    table.add(std::move(cells));
  }
  fmt::print("{}", table.text(isColoured()));
}

void Output::say(std::string_view sentence, const Dictionary& object) const {
  if (_isJson) {
    fmt::print("{}\n", printableJson(compactJson(object)));
  } else {
    fmt::print("{}\n", printableText(sentence));
  }
}

}  // namespace palisade
