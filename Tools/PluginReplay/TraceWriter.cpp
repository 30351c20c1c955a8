#include "Tools/PluginReplay/TraceWriter.h"

#include <algorithm>
#include <utility>

#include "Host/Json/Json.h"
#include "Platform/AccountConstants.h"
#include "Testing/TraceValue.h"
#include "Tools/PluginReplay/ConstantNames.h"

namespace palisade {
namespace {

// Members whose text is one of the platform's constants, wherever they stand.
constexpr std::string_view constantMembers[] = {"accountType", "domain", "entitlement", "identifier", "key"};

Value named(const Value& value) { return value.string() == nullptr ? value : Value(constantName(*value.string())); }

Value namedOptions(const Value& options) {
  if (options.dictionary() == nullptr) return options;
  Dictionary result;
  for (const auto& [key, value] : *options.dictionary()) {
    result.set(constantName(key), key == FacebookAudienceKey ? named(value) : value);
  }
  return result;
}

Value namedError(const Value& error) {
  if (error.dictionary() == nullptr) return error;
  Dictionary content = *error.dictionary()->find("$error")->dictionary();
  content.set("domain", named(*content.find("domain")));
  return Dictionary{{"$error", std::move(content)}};
}

Value namedRecord(const Value& record) {
  Dictionary result = *record.dictionary();
  result.set("options", namedOptions(*result.find("options")));
  return result;
}

Value written(const Event& event) {
  Dictionary result{{"event", event.name}, {"thread", event.thread}};
  for (const auto& [name, value] : event.members) {
    if (std::ranges::find(constantMembers, name) != std::end(constantMembers) ||
        (name == "name" && event.name == "NotificationBus.register")) {
      result.set(name, named(value));
    } else if (name == "error") {
      result.set(name, namedError(value));
    } else if (name == "record") {
      result.set(name, namedRecord(value));
    } else {
      result.set(name, value);
    }
  }
  return result;
}

std::string write(const std::optional<std::string>& scenarioID, const char* member, Value value) {
  return writeJson(Dictionary{{"scenario", traceText(scenarioID)}, {member, std::move(value)}});
}

}  // namespace

std::string writeTrace(const std::optional<std::string>& scenarioID, const std::vector<Event>& events) {
  Array list;
  list.reserve(events.size());
  std::ranges::transform(events, std::back_inserter(list), written);
  return write(scenarioID, "events", std::move(list));
}

std::string writeScenarioError(const std::optional<std::string>& scenarioID, std::string_view text) {
  return write(scenarioID, "error", text);
}

std::string writeCrash(const std::optional<std::string>& scenarioID, int signal) { return write(scenarioID, "crash", signal); }

}  // namespace palisade
