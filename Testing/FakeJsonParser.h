#pragma once

/// The real JSON parser, made to fail on demand. See `JsonParser`. Parsing is not in the trace.

#include <memory>
#include <string_view>
#include <utility>

#include "Platform/JsonParser.h"
#include "Testing/Instruments.h"

namespace palisade {

class FakeJsonParser final : public JsonParser {
 public:
  FakeJsonParser(Instruments instruments, std::shared_ptr<const JsonParser> parser)
      : _instruments(instruments),
        _parser(std::move(parser)) {}

  JsonParseResult parse(std::string_view data, JsonFragments fragments) const override {
    _instruments.faults.enter("JsonParser.parse");
    return _parser->parse(data, fragments);
  }

 private:
  Instruments _instruments;
  std::shared_ptr<const JsonParser> _parser;
};

}  // namespace palisade
