#include "Host/Social/ServerConfiguration.h"

#include <algorithm>
#include <cstdint>
#include <string_view>
#include <vector>

namespace palisade {
namespace {

constexpr std::int64_t longestLimit = 24 * 3600;
constexpr std::int64_t largestBody = 16 * 1024 * 1024;
constexpr std::string_view scheme = "https://";

// One table of the file. Each key is asked for by name; what nobody has asked for in the end is unknown.
class Table {
 public:
  Table(const Dictionary& table, std::string prefix) : _table(table), _prefix(std::move(prefix)) {}

  const std::string* text(std::string_view key, std::string_view what) {
    const Value* const value = take(key);
    if (value == nullptr) return nullptr;
    if (value->string() == nullptr || value->string()->empty()) refuse(key, what);
    return value->string();
  }

  void text(std::string_view key, std::string_view what, std::string& place) {
    if (const std::string* const found = text(key, what)) place = *found;
  }

  std::int64_t number(std::string_view key, std::int64_t most, std::int64_t otherwise) {
    const Value* const value = take(key);
    if (value == nullptr) return otherwise;
    if (value->integer() == nullptr || *value->integer() < 1 || *value->integer() > most) {
      refuse(key, "a whole number from 1 to " + std::to_string(most));
    }
    return *value->integer();
  }

  void seconds(std::string_view key, std::chrono::seconds& place) {
    place = std::chrono::seconds(number(key, longestLimit, place.count()));
  }

  Table section(std::string_view key) {
    static const Dictionary none;
    const Value* const value = take(key);
    if (value != nullptr && value->dictionary() == nullptr) refuse(key, "a table");
    return {value == nullptr ? none : *value->dictionary(), _prefix + std::string(key) + "."};
  }

  void finish() const {
    for (const auto& [key, value] : _table) {
      if (std::find(_asked.begin(), _asked.end(), key) != _asked.end()) continue;
      std::string known;
      for (const std::string& name : _asked) known.append(known.empty() ? "" : ", ").append(name);
      throw ServerConfigurationError("There is no setting \"" + _prefix + key + "\" here. Known are: " + known + ".");
    }
  }

  [[noreturn]] void refuse(std::string_view key, std::string_view what) const {
    throw ServerConfigurationError("The setting \"" + _prefix + std::string(key) + "\" must be " + std::string(what) + ".");
  }

 private:
  const Value* take(std::string_view key) {
    _asked.emplace_back(key);
    return _table.find(key);
  }

  const Dictionary& _table;
  std::string _prefix;
  std::vector<std::string> _asked;
};

bool isAddress(std::string_view address) {
  if (!address.starts_with(scheme) || address.size() == scheme.size()) return false;
  address.remove_prefix(scheme.size());
  return std::all_of(address.begin(), address.end(), [](char character) {
    return (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z') ||
           (character >= '0' && character <= '9') || std::string_view(".-:[]").find(character) != std::string_view::npos;
  });
}

// Of what stands in a path as it is: letters, digits, and what separates them.
bool isPath(std::string_view path) {
  return path.starts_with('/') && std::all_of(path.begin(), path.end(), [](unsigned char byte) {
           return byte > ' ' && byte < 0x7F && byte != '?' && byte != '#';
         });
}

void readPath(Table& table, std::string_view key, std::string& place) {
  static constexpr std::string_view what = "a path that begins with \"/\" and has no query";
  table.text(key, what, place);
  if (!isPath(place)) table.refuse(key, what);
}

}  // namespace

ServerConfiguration::ServerConfiguration(const Dictionary& table) {
  Table top(table, "");
  static constexpr std::string_view addressForm = "an address like \"https://graph.example.com\", without path or user";
  top.text("address", addressForm, address);
  if (address.ends_with('/')) address.pop_back();
  if (table.find("address") != nullptr && !isAddress(address)) top.refuse("address", addressForm);

  static constexpr std::string_view fileForm = "the absolute path of a file of PEM certificates";
  if (const std::string* const file = top.text("certificate_authorities", fileForm)) {
    certificateAuthorities = *file;
    if (!certificateAuthorities->is_absolute()) top.refuse("certificate_authorities", fileForm);
  }
  static constexpr std::string_view proxyForm = "an address like \"http://proxy.example.com:3128\"";
  if (const std::string* const server = top.text("proxy", proxyForm)) {
    if (server->find("://") == std::string::npos) top.refuse("proxy", proxyForm);
    proxy = *server;
  }

  Table pathTable = top.section("paths");
  readPath(pathTable, "authorization", paths.authorization);
  readPath(pathTable, "description", paths.description);
  readPath(pathTable, "invalidation", paths.invalidation);
  pathTable.finish();

  Table parameterTable = top.section("parameters");
  static constexpr std::string_view nameForm = "the name of a form field";
  parameterTable.text("app_id", nameForm, parameters.appID);
  parameterTable.text("bundle_id", nameForm, parameters.bundleID);
  parameterTable.text("permissions", nameForm, parameters.permissions);
  parameterTable.text("audience", nameForm, parameters.audience);
  parameterTable.text("age", nameForm, parameters.age);
  parameterTable.finish();

  Table limitTable = top.section("limits");
  limitTable.seconds("connect_seconds", limits.connect);
  limitTable.seconds("stall_seconds", limits.stall);
  limitTable.seconds("total_seconds", limits.total);
  limits.bodyBytes =
      static_cast<std::size_t>(limitTable.number("body_bytes", largestBody, static_cast<std::int64_t>(limits.bodyBytes)));
  limitTable.finish();
  top.finish();
}

HttpClientOptions ServerConfiguration::httpOptions() const {
  return {.certificateAuthorities = certificateAuthorities,
          .proxy = proxy,
          .connectLimit = limits.connect,
          .stallLimit = limits.stall,
          .totalLimit = limits.total,
          .bodyLimit = limits.bodyBytes};
}

}  // namespace palisade
