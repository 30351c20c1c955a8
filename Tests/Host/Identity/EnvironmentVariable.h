#pragma once

/// An environment variable that has another value, or none, until the end of the test.

#include <cstdlib>
#include <optional>
#include <string>
#include <utility>

class EnvironmentVariable {
 public:
  EnvironmentVariable(std::string name, const std::optional<std::string>& value) : _name(std::move(name)) {
    if (const char* before = std::getenv(_name.c_str())) _before = before;
    set(value);
  }
  EnvironmentVariable(const EnvironmentVariable&) = delete;
  EnvironmentVariable& operator=(const EnvironmentVariable&) = delete;
  ~EnvironmentVariable() { set(_before); }

  void set(const std::optional<std::string>& value) const {
    if (value) {
      setenv(_name.c_str(), value->c_str(), 1);
    } else {
      unsetenv(_name.c_str());
    }
  }

 private:
  std::string _name;
  std::optional<std::string> _before;
};

/// An environment that says nothing about the user's language.
struct NoLanguage {
  EnvironmentVariable language{"LANGUAGE", std::nullopt};
  EnvironmentVariable all{"LC_ALL", std::nullopt};
  EnvironmentVariable messages{"LC_MESSAGES", std::nullopt};
  EnvironmentVariable lang{"LANG", std::nullopt};
};
