#include "Host/Identity/SnapName.h"

#include <cstddef>

#include "Host/Identity/ApplicationID.h"
#include "Host/Identity/IdentityError.h"

namespace palisade {
namespace {

constexpr std::string_view prefix = "snap.";

// Takes the text up to the divider off `text`, and the divider with it.
std::string_view takeUntil(std::string_view& text, char divider) {
  const std::size_t end = text.find(divider);
  const std::string_view piece = text.substr(0, end);
  text.remove_prefix(end == std::string_view::npos ? text.size() : end + 1);
  return piece;
}

Snap snapFrom(std::string_view name, std::string_view application, bool isConfined, std::string_view evidence) {
  if (!isSnapName(name)) throw IdentityError("'" + std::string(evidence) + "' does not name a snap.");
  return {.name = std::string(name), .application = std::string(application), .isConfined = isConfined};
}

// The application's name ends where the random part of a scope or the suffix of a service begins. Applications of snaps may
// hold dashes, so a UUID is cut off by its length.
std::string_view applicationIn(std::string_view text) {
  constexpr std::size_t dashAndUUID = 37;
  const std::string_view stem = text.substr(0, text.find('.'));
  const bool hasUUID = text.ends_with(".scope") && stem.size() > dashAndUUID && stem[stem.size() - dashAndUUID] == '-';
  return hasUUID ? stem.substr(0, stem.size() - dashAndUUID) : stem;
}

// One element of a cgroup's path. snapd's freezer cgroup is called "snap.NAME", its units "snap.NAME.APPLICATION-UUID.scope"
// and "snap.NAME.APPLICATION.service".
std::optional<Snap> snapOfElement(std::string_view element, bool isFreezer) {
  if (!element.starts_with(prefix)) return std::nullopt;
  std::string_view rest = element.substr(prefix.size());
  if (isFreezer) return snapFrom(rest, {}, true, element);
  if (!element.ends_with(".scope") && !element.ends_with(".service")) return std::nullopt;
  const std::string_view name = takeUntil(rest, '.');
  return snapFrom(name, applicationIn(rest), true, element);
}

}  // namespace

std::optional<Snap> snapOfLabel(std::string_view label) {
  label = label.substr(0, label.find_first_of(std::string_view("\n\0", 2)));
  if (!label.starts_with(prefix)) return std::nullopt;
  std::string_view mode = label.substr(prefix.size());
  std::string_view application = takeUntil(mode, ' ');
  const std::string_view name = takeUntil(application, '.');
  const bool isWellFormed = !application.empty() && (mode.empty() || (mode.starts_with('(') && mode.ends_with(')')));
  return snapFrom(isWellFormed ? name : "", application, mode == "(enforce)", label);
}

std::optional<Snap> snapOfCgroups(std::string_view cgroups) {
  std::optional<Snap> found;
  while (!cgroups.empty()) {
    std::string_view path = takeUntil(cgroups, '\n');
    takeUntil(path, ':');
    const std::string_view controllers = takeUntil(path, ':');
    const bool isFreezer = controllers == "freezer";
    if (!isFreezer && !controllers.empty() && controllers != "name=systemd") continue;
    while (!path.empty()) {
      const auto snap = snapOfElement(takeUntil(path, '/'), isFreezer);
      if (!snap) continue;
      if (found && found->name != snap->name) {
        throw IdentityError("The caller's cgroups belong to two snaps, " + found->name + " and " + snap->name + ".");
      }
      if (!found || found->application.empty()) found = snap;
    }
  }
  return found;
}

}  // namespace palisade
