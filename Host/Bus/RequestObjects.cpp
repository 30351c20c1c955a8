#include "Host/Bus/RequestObjects.h"

#include <sys/random.h>

#include <algorithm>
#include <cerrno>
#include <system_error>

#include "Host/Bus/BusLoop.h"
#include "Host/Secrets/KnownSecrets.h"
#include "Host/Text/ValidText.h"

namespace palisade {
namespace {

constexpr const char* requestInterface = "com.veltran.Accounts1.Request";
constexpr std::size_t longestHandleToken = 64;

std::string pathElement(std::string uniqueName) {
  std::erase(uniqueName, ':');
  std::ranges::replace(uniqueName, '.', '_');
  return uniqueName;
}

bool isPathElement(const std::string& token) {
  const auto mayStand = [](char character) {
    return (character >= 'a' && character <= 'z') || (character >= 'A' && character <= 'Z') ||
           (character >= '0' && character <= '9') || character == '_';
  };
  return !token.empty() && token.size() <= longestHandleToken && std::ranges::all_of(token, mayStand);
}

// The kernel's numbers: the standard library's device finds out each time what the processor can do, and where that is a
// virtual one it takes longer than the rest of the call.
std::string randomToken() {
  std::uint64_t number = 0;
  if (getrandom(&number, sizeof number, 0) != sizeof number) {
    throw std::system_error(errno, std::generic_category(), "No path for the request");
  }
  return "t" + std::to_string(number);
}

// What a server or a file had to say may be of any length, and may repeat what the server was sent.
std::string explanationOf(std::string_view text) {
  constexpr std::size_t longestExplanation = 4096;
  return KnownSecrets::ofProcess().withoutSecrets(validText(shortened(text, longestExplanation)));
}

BusDictionary resultsOf(const AccessOutcome& outcome) {
  BusDictionary results;
  if (!outcome.error) return results;
  results.emplace("error_domain", validText(outcome.error->domain));
  results.emplace("error_code", std::int32_t{outcome.error->code});
  if (outcome.error->description) results.emplace("error_message", explanationOf(*outcome.error->description));
  return results;
}

const char* nameOf(BusFailureKind kind) {
  switch (kind) {
    case BusFailureKind::invalidArguments: return "InvalidArguments";
    case BusFailureKind::notPermitted: return "NotPermitted";
    case BusFailureKind::unknownCaller: return "UnknownCaller";
    case BusFailureKind::noSuchAccount: return "NoSuchAccount";
    case BusFailureKind::noSuchClient: return "NoSuchClient";
    case BusFailureKind::notGranted: return "NotGranted";
    case BusFailureKind::tooManyRequests: return "TooManyRequests";
    case BusFailureKind::notAsked: return "NotAsked";
    case BusFailureKind::accessRevoked: return "AccessRevoked";
    case BusFailureKind::keychainUnavailable: return "KeychainUnavailable";
    case BusFailureKind::storeUnavailable: return "StoreUnavailable";
    case BusFailureKind::failed: break;
  }
  return "Failed";
}

}  // namespace

sdbus::Error busError(const BusFailure& failure) {
  return sdbus::Error(std::string("com.veltran.Accounts1.Error.") + nameOf(failure.kind()), explanationOf(failure.what()));
}

RequestObjects::RequestObjects(sdbus::IConnection& connection, std::function<void(std::uint64_t)> close)
    : _connection(connection),
      _close(std::move(close)) {}

std::shared_ptr<const std::string> RequestObjects::reserve(const std::string& caller, const std::string& token) {
  if (!isPathElement(token)) {
    throw BusFailure(BusFailureKind::invalidArguments,
                     "'handle_token' may hold up to 64 letters, digits and underscores, and nothing else.");
  }
  const std::string path = "/com/veltran/Accounts1/request/" + pathElement(caller) + "/" + token;
  const std::lock_guard lock(_mutex);
  if (!_paths.insert(path).second) {
    throw BusFailure(BusFailureKind::invalidArguments, "'handle_token' names a request of yours that still waits.");
  }
  return {new std::string(path), [this](const std::string* reserved) {
            {
              const std::lock_guard guard(_mutex);
              _paths.erase(*reserved);
            }
            delete reserved;
          }};
}

BusRequest::BusRequest(RequestObjects& objects, std::string caller, const std::optional<std::string>& token,
                       AccessResult result)
    : _objects(objects),
      _caller(std::move(caller)),
      _identifier(++objects._lastIdentifier),
      _path(token ? objects.reserve(_caller, *token) : nullptr),
      _result(std::move(result)) {}

BusRequest::~BusRequest() = default;

void BusRequest::becomePending() {
  {
    const std::lock_guard lock(_mutex);
    _isPending = true;
  }
  try {
    // The thread that carries the request goes on with it meanwhile.
    BusLoop::handOver([request = shared_from_this()] {
      const std::lock_guard lock(request->_mutex);
      request->announce();
    });
  } catch (const BusFailure&) {
    const std::lock_guard lock(_mutex);
    _isPending = false;
    throw;
  }
}

void BusRequest::announce() {
  if (_object != nullptr) return;
  // Most requests never wait; only one that does needs a path, and pays for one that nobody can guess.
  if (_path == nullptr) _path = _objects.reserve(_caller, randomToken());
  _object = sdbus::createObject(_objects._connection, *_path);
  _object->registerMethod("Close")
      .onInterface(requestInterface)
      .withInputParamNames("options")
      .implementedAs([this, object = _object.get()](const BusDictionary&) {
        if (object->getCurrentlyProcessedMessage()->getSender() != _caller) {
          throw busError({BusFailureKind::notPermitted, "This request belongs to another connection."});
        }
        _objects._close(_identifier);
      });
  _object->registerSignal("Response")
      .onInterface(requestInterface)
      .withParameters<std::uint32_t, BusDictionary>("response", "results");
  _object->finishRegistration();
  _result.returnResults(sdbus::ObjectPath(*_path), static_cast<std::uint32_t>(AccessResponse::pending), {});
}

void BusRequest::answerAtOnce(const AccessOutcome& outcome) {
  const std::lock_guard lock(_mutex);
  if (!_isPending || _isAnswered) return;
  try {
    send(outcome);
    _isAnswered = true;
  } catch (const sdbus::Error&) {
    // `finish` meets that too, and tells.
  }
}

void BusRequest::finish(const AccessOutcome& outcome) {
  const std::lock_guard lock(_mutex);
  if (_isAnswered) return;
  send(outcome);
  _isAnswered = true;
}

void BusRequest::send(const AccessOutcome& outcome) {
  const auto response = static_cast<std::uint32_t>(outcome.response);
  if (!_isPending) return _result.returnResults(sdbus::ObjectPath("/"), response, resultsOf(outcome));
  announce();
  auto signal = _object->createSignal(requestInterface, "Response");
  signal << response << resultsOf(outcome);
  signal.setDestination(_caller);
  _object->emitSignal(signal);
}

void BusRequest::fail(const BusFailure& failure) {
  const auto error = busError(failure);
  {
    const std::lock_guard lock(_mutex);
    if (_isAnswered) return;
    if (!_isPending) {
      _isAnswered = true;
      return _result.returnError(error);
    }
  }
  // In neither case has anybody decided about the request.
  const bool isUndecided = failure.kind() == BusFailureKind::notAsked || failure.kind() == BusFailureKind::accessRevoked;
  finish({.response = isUndecided ? AccessResponse::withdrawn : AccessResponse::refused,
          .error = Error{.domain = error.getName(), .code = 0, .description = failure.what()}});
}

}  // namespace palisade
