#pragma once

/// A value in a JSON document together with the way to it, so that an error can say where it is.
///
/// Threads: a plain value. Ownership: borrows the document, which has to outlive it.
/// Errors: a value of another type or range than asked for is a `ScenarioError` that names the place.

#include <cstdint>
#include <initializer_list>
#include <optional>
#include <stdexcept>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include "Platform/Value.h"

namespace palisade {

/// What is wrong with a scenario, for whoever wrote it: `operations[2].client: no client "x" is defined`.
class ScenarioError : public std::runtime_error {
 public:
  using std::runtime_error::runtime_error;
};

class JsonObject;

class JsonPlace {
 public:
  JsonPlace(const Value& value, std::string path) : _value(&value), _path(std::move(path)) {}

  const Value& value() const { return *_value; }
  bool isNull() const { return _value->isNull(); }

  const std::string& text() const;
  bool boolean() const;
  int integer() const;
  std::vector<JsonPlace> elements() const;
  /// An object with any members, in the order in which they are written.
  std::vector<std::pair<std::string, JsonPlace>> entries() const;
  /// An object that may have these members and no others.
  JsonObject object(std::initializer_list<std::string_view> members) const;

  [[noreturn]] void fail(const std::string& problem) const;
  [[noreturn]] void failAsNo(std::string_view expectedType) const;

 private:
  JsonPlace member(const std::string& name, const Value& value) const;
  const Dictionary& dictionary() const;

  const Value* _value;
  std::string _path;
};

class JsonObject {
 public:
  JsonObject(JsonPlace place, std::vector<std::pair<std::string, JsonPlace>> entries)
      : _place(std::move(place)),
        _entries(std::move(entries)) {}

  std::optional<JsonPlace> find(std::string_view member) const;
  /// The member when it is there and not null.
  std::optional<JsonPlace> findValue(std::string_view member) const;
  JsonPlace require(std::string_view member) const;

 private:
  JsonPlace _place;
  std::vector<std::pair<std::string, JsonPlace>> _entries;
};

}  // namespace palisade
