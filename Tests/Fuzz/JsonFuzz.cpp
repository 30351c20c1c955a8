/// Whatever text arrives: it is refused with a place and without a value, or it is a value that reads back as it was written.

#include <cstdint>
#include <cstdlib>
#include <string_view>

#include "Host/Json/Json.h"

using namespace palisade;

namespace {

void require(bool kept) {
  if (!kept) std::abort();
}

// Every message of the parser is short and plain; what it quoted of the text would sooner or later be neither.
bool isPlain(std::string_view description) {
  if (!description.starts_with("Line ") || description.size() > 120) return false;
  for (const char character : description) {
    if (character < ' ' || character > '~') return false;
  }
  return true;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
  const std::string_view text(reinterpret_cast<const char*>(data), size);
  const NlohmannJsonParser parser;
  const JsonParseResult result = parser.parse(text, JsonFragments::allowed);
  if (result.error) {
    require(!result.value && isPlain(result.error->description.value_or("")));
    return 0;
  }
  require(result.value.has_value());
  const JsonParseResult again = parser.parse(writeJson(*result.value), JsonFragments::allowed);
  require(again.value == result.value);

  const bool isWhole = result.value->array() != nullptr || result.value->dictionary() != nullptr;
  require(parser.parse(text, JsonFragments::refused).value.has_value() == isWhole);
  return 0;
}
