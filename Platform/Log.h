#pragma once

/// The daemon's log facility.
///
/// A record keeps its format and its arguments apart, so that the daemon can remove secrets from single arguments, store them
/// as fields, and render nothing that nobody reads. Threads: every operation may be called from any thread. Ownership: a record
/// and its arguments borrow what they show; they are valid until `write` returns. Errors: no operation fails; a log that cannot
/// write loses the record and says so elsewhere.

#include <array>
#include <cstdint>
#include <memory>
#include <optional>
#include <source_location>
#include <span>
#include <string>
#include <string_view>
#include <variant>

#include "Platform/Error.h"
#include "Platform/PermissionSet.h"
#include "Platform/Value.h"

namespace palisade {

class Account;
class Client;

/// Severities, numbered as in syslog(3).
enum class LogLevel : int { error = 3, notice = 5, debug = 7 };

/// One argument of a record, by reference. None is told apart from every value.
class LogArgument {
 public:
  using Content = std::variant<std::monostate, std::string_view, std::int64_t, const Client*, const Account*, const Value*,
                               const Error*, const PermissionSet*>;

  LogArgument(std::string_view text) : _content(text) {}
  LogArgument(const std::string& text) : _content(std::string_view(text)) {}
  LogArgument(const std::optional<std::string>& text) {
    if (text) _content = std::string_view(*text);
  }
  LogArgument(std::size_t count) : _content(static_cast<std::int64_t>(count)) {}
  LogArgument(const Value& value) : _content(&value) {}
  LogArgument(const Value* value) { point(value); }
  LogArgument(const std::optional<Error>& error) { point(error ? &*error : nullptr); }
  LogArgument(const PermissionSetRef& permissions) { point(permissions.get()); }
  LogArgument(const PermissionSet& permissions) : _content(&permissions) {}
  LogArgument(const std::shared_ptr<const Client>& client) { point(client.get()); }
  LogArgument(const std::shared_ptr<Account>& account) { point(static_cast<const Account*>(account.get())); }

  const Content& content() const { return _content; }

 private:
  template <typename Object>
  void point(const Object* object) {
    if (object != nullptr) _content = object;
  }

  Content _content;
};

/// Where a record was written: the operation's full keyword-style name, the source file and the line.
struct LogPlace {
  constexpr LogPlace(const char* name, std::source_location here = std::source_location::current())
      : operationName(name),
        where(here) {}

  std::string_view operationName;
  std::source_location where;
};

struct LogRecord {
  LogPlace place;
  LogLevel level;
  /// "%@" takes the next argument, "%d" the next one, a number; see `formatLogMessage`.
  std::string_view format;
  /// The arguments' names in the source, joined by ", "; empty when there are none.
  std::string_view argumentNames;
  std::span<const LogArgument> arguments;
};

/// The audit record of one decision about a client's access.
struct AccessRequestRecord {
  std::string_view accountTypeIdentifier;
  std::optional<std::string> bundleID;
  bool granted = false;
  bool userPrompted = false;
  double elapsedSeconds = 0.0;
};

class Log {
 public:
  virtual ~Log() = default;

  virtual bool isEnabled(LogLevel level) const = 0;
  virtual void write(const LogRecord& record) = 0;
  virtual void logAccessRequest(const AccessRequestRecord& record) = 0;

  /// Writes a record when its level is enabled; costs one call when it is not.
  template <typename... Arguments>
  void record(LogPlace place, LogLevel level, std::string_view format, std::string_view argumentNames,
              const Arguments&... arguments) {
    if (!isEnabled(level)) return;
    const std::array<LogArgument, sizeof...(Arguments)> borrowed{LogArgument(arguments)...};
    write({.place = place, .level = level, .format = format, .argumentNames = argumentNames, .arguments = borrowed});
  }
};

}  // namespace palisade
