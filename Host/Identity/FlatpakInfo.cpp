#include "Host/Identity/FlatpakInfo.h"

#include "Host/Identity/ApplicationID.h"
#include "Host/Identity/IdentityError.h"
#include "Host/Identity/KeyFile.h"

namespace palisade {

std::string flatpakApplicationID(std::string_view info) {
  const auto file = keyFileFromText(info);
  if (!file) throw IdentityError("The caller's /.flatpak-info is malformed.");
  const auto application = file->find("Application");
  if (application == file->end()) {
    throw IdentityError("The caller's /.flatpak-info names no application: a runtime was started on its own.");
  }
  const auto name = application->second.find("name");
  if (name == application->second.end() || !isApplicationID(name->second)) {
    throw IdentityError("The caller's /.flatpak-info gives its application no valid name.");
  }
  return name->second;
}

}  // namespace palisade
