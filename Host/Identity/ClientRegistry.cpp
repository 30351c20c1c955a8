#include "Host/Identity/ClientRegistry.h"

#include <fcntl.h>

#include <utility>

#include "Host/Identity/ClientRecordFiles.h"
#include "Host/Identity/ConnectionOwner.h"
#include "Host/Identity/DesktopEntry.h"
#include "Host/Identity/DisplayName.h"
#include "Host/Identity/FlatpakInfo.h"
#include "Host/Identity/Namespaces.h"
#include "Host/Identity/PinnedProcess.h"
#include "Host/Identity/SnapName.h"
#include "Host/Identity/UnitName.h"

// Sandboxes say who is inside them; one that does not is still one. A unit says for whom it was started, and the executable
// says what runs; both are weaker, so they count for an application only when a record says that they are enough. Whoever fits
// two records is refused: a guess would hand one application's grants to the other.

namespace palisade {
namespace {

using ClientRef = std::shared_ptr<const RegisteredClient>;

ClientRef clientFrom(const ClientRecord& record, ClientClass clientClass, bool isBeyondImitation = false) {
  return std::make_shared<const RegisteredClient>(RegisteredClient::Description{.id = record.bundleID,
                                                                                .bundleID = record.bundleID,
                                                                                .name = localizedName(record),
                                                                                .clientClass = clientClass,
                                                                                .entitlements = record.entitlements,
                                                                                .recordFile = record.file.string(),
                                                                                .isBeyondImitation = isBeyondImitation});
}

// A sandboxed application without a record is known by what its sandbox calls it.
ClientRef clientFromSandbox(const std::string& id, const std::string& desktopFile, ClientClass clientClass,
                            bool isBeyondImitation) {
  std::string name;
  if (const auto localized = nameInDesktopFile(desktopFile)) name = displayName(textForLocales(*localized, userLocales()));
  return std::make_shared<const RegisteredClient>(RegisteredClient::Description{.id = id,
                                                                                .bundleID = id,
                                                                                .name = name.empty() ? id : name,
                                                                                .clientClass = clientClass,
                                                                                .entitlements = {},
                                                                                .recordFile = {},
                                                                                .isBeyondImitation = isBeyondImitation});
}

// What no other ID begins with: paths begin with a slash, and bundle IDs hold no colon.
const std::string inSandbox = "sandbox:";

// A program without a record is known by its path. In another part of the file system the path may name another file, and so it
// may when the file was replaced; then it says nothing.
ClientRef clientFromProgram(const Program& program, ClientClass clientClass) {
  const std::string path = program.path.string();
  const bool isInSandbox = clientClass == ClientClass::unknownSandbox;
  if (!isShownAsItIs(path)) {
    throw IdentityError("The caller's program has a path that cannot be shown: " + displayIdentifier(path) + ".");
  }
  if (fileIdentity(program.path) != program.file) {
    throw IdentityError("The caller's program is not the one at " + path +
                        ": it was replaced or removed since it started, or runs in a container. Start it again.");
  }
  return std::make_shared<const RegisteredClient>(RegisteredClient::Description{.id = (isInSandbox ? inSandbox : "") + path,
                                                                                .bundleID = std::nullopt,
                                                                                .name = displayNameOfProgram(path),
                                                                                .clientClass = clientClass,
                                                                                .entitlements = {},
                                                                                .recordFile = {}});
}

// Whether the kernel lets no unconfined program take a sandbox's label: elsewhere aa-exec(1) gives any of them to anybody.
bool keepsLabelsFromOthers() {
  const FileDescriptor setting(open("/proc/sys/kernel/apparmor_restrict_unprivileged_unconfined", O_RDONLY | O_CLOEXEC));
  return setting.isOpen() && readAtMost(setting, 16).value_or("").starts_with('1');
}

// A sandbox hides the session's users, files or processes. Whoever holds the bus sees them; the daemon may see less than that.
bool seesWhatTheBusSees(const PinnedProcess& caller, pid_t busProcess) {
  const FileDescriptor folder(open(("/proc/" + std::to_string(busProcess)).c_str(), O_PATH | O_DIRECTORY | O_CLOEXEC));
  const auto ofBus = busProcess > 0 && folder.isOpen() ? namespacesIn(folder) : std::nullopt;
  if (!ofBus) throw IdentityError("The namespaces of the session bus cannot be read, so nobody can tell who is in a sandbox.");
  const auto ofCaller = namespacesIn(caller.folder());
  if (!ofCaller) throw IdentityError("The caller's namespaces cannot be read.");
  return ofCaller == ofBus;
}

}  // namespace

struct ClientRegistry::Implementation {
  ClientRecords content;

  // The one record that fits, or null.
  template <typename Fits>
  const ClientRecord* record(const Fits& fits) const {
    const ClientRecord* found = nullptr;
    for (const ClientRecord& candidate : content.records) {
      if (!fits(candidate.match)) continue;
      if (found != nullptr) {
        throw IdentityError("The caller fits two client records, " + found->file.string() + " and " + candidate.file.string() +
                            ". Make one of them more exact.");
      }
      found = &candidate;
    }
    return found;
  }

  const ClientRecord* recordWithID(const std::string& id) const {
    for (const ClientRecord& candidate : content.records) {
      if (candidate.bundleID == id) return &candidate;
    }
    return nullptr;
  }

  ClientRef sandboxed(std::optional<std::string> ClientMatch::*kind, const std::string& kindKey, const std::string& id,
                      const std::string& desktopFile, ClientClass clientClass, bool isBeyondImitation) const {
    if (const ClientRecord* fitting = record([&](const ClientMatch& match) { return match.*kind == id; })) {
      return clientFrom(*fitting, clientClass, isBeyondImitation);
    }
    // Anybody can call a sandboxed application what a record calls another one.
    if (const ClientRecord* other = recordWithID(id)) {
      throw IdentityError("The sandboxed caller is called '" + id + "' like the application of " + other->file.string() +
                          ", which does not recognise it. If it is the same, add " + kindKey + " = \"" + id + "\" to [match].");
    }
    return clientFromSandbox(id, desktopFile, clientClass, isBeyondImitation);
  }

  ClientRef clientBehind(const PinnedProcess& caller, pid_t busProcess) const {
    if (const auto info = caller.flatpakInfo()) {
      const std::string id = flatpakApplicationID(*info);
      return sandboxed(&ClientMatch::flatpak, "flatpak", id, id + ".desktop", ClientClass::sandboxed, false);
    }

    auto snap = snapOfLabel(caller.securityLabel().value_or(""));
    const bool isBeyondImitation = snap && keepsLabelsFromOthers();
    if (!snap) snap = snapOfCgroups(caller.cgroups());
    if (snap) {
      const std::string desktopFile = snap->name + "_" + snap->application + ".desktop";
      const auto clientClass = snap->isConfined ? ClientClass::sandboxed : ClientClass::unit;
      return sandboxed(&ClientMatch::snap, "snap", snap->name, desktopFile, clientClass, isBeyondImitation);
    }

    const Program program = caller.program();
    // Its unit is the one of whoever started the sandbox, and its path is one that the sandbox has laid out.
    if (!seesWhatTheBusSees(caller, busProcess)) return clientFromProgram(program, ClientClass::unknownSandbox);
    const auto isProgram = [&](const std::filesystem::path& path) { return fileIdentity(path) == program.file; };
    if (const auto unit = caller.userUnit()) {
      const auto application = applicationOfUnit(*unit);
      const auto fits = [&](const ClientMatch& match) {
        return match.unit && (match.unit == unit || match.unit == application) &&
               (!match.executable || isProgram(*match.executable));
      };
      if (const ClientRecord* fitting = record(fits)) return clientFrom(*fitting, ClientClass::unit);
    }
    const auto fits = [&](const ClientMatch& match) {
      return match.isRecognisedByExecutable() && isProgram(*match.executable);
    };
    if (const ClientRecord* fitting = record(fits)) return clientFrom(*fitting, ClientClass::bare);
    return clientFromProgram(program, ClientClass::bare);
  }
};

ClientRegistry::ClientRegistry(const std::vector<std::filesystem::path>& folders,
                               const std::vector<std::filesystem::path>& systemFolders)
    : _implementation(
          std::make_unique<const Implementation>(Implementation{.content = readClientRecords(folders, systemFolders)})) {}

ClientRegistry::~ClientRegistry() = default;

std::shared_ptr<const RegisteredClient> ClientRegistry::identify(const CallingConnection& connection) const {
  const PinnedProcess caller = processBehind(connection);
  requireOwnConnection(caller, connection);
  auto client = _implementation->clientBehind(caller, connection.busProcess);
  caller.requireAlive();
  return client;
}

std::shared_ptr<const RegisteredClient> ClientRegistry::clientWithID(const std::string& id) const {
  const ClientRecord* record = _implementation->recordWithID(id);
  return record == nullptr ? nullptr : clientFrom(*record, record->match.weakestClass());
}

std::vector<std::shared_ptr<const RegisteredClient>> ClientRegistry::clients() const {
  std::vector<std::shared_ptr<const RegisteredClient>> all;
  for (const ClientRecord& record : _implementation->content.records) {
    all.push_back(clientFrom(record, record.match.weakestClass()));
  }
  return all;
}

std::vector<std::string> ClientRegistry::troubles() const { return _implementation->content.troubles; }

}  // namespace palisade
