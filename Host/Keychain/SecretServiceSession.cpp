#include "Host/Keychain/SecretServiceSession.h"

// The library's synchronous calls have no time limit of their own, so a watch cancels them. Its objects deliver what the
// service announces to the main loop of whoever made them. A daemon without such a loop would collect these announcements for
// ever: they go to a context of the session's, which is emptied after every operation.

#include <condition_variable>
#include <string_view>
#include <thread>

#include "Host/Keychain/KeychainError.h"

namespace palisade {
namespace {

constexpr std::string_view encryptedSession = "dh-ietf1024-sha256-aes128-cbc-pkcs7";

class TimeLimit {
 public:
  explicit TimeLimit(std::chrono::milliseconds limit)
      : _cancellable(g_cancellable_new()),
        _watch([this, limit](const std::stop_token& isOver) {
          std::unique_lock lock(_mutex);
          _never.wait_for(lock, isOver, limit, [] { return false; });
          if (!isOver.stop_requested()) g_cancellable_cancel(_cancellable.get());
        }) {}

  GCancellable* cancellable() const { return _cancellable.get(); }

 private:
  GHandle<GCancellable> _cancellable;
  std::mutex _mutex;
  std::condition_variable_any _never;
  std::jthread _watch;
};

class OwnContext {
 public:
  explicit OwnContext(GMainContext* context) : _context(context) { g_main_context_push_thread_default(_context); }
  OwnContext(const OwnContext&) = delete;
  OwnContext& operator=(const OwnContext&) = delete;
  ~OwnContext() {
    while (g_main_context_iteration(_context, FALSE) != FALSE) {
    }
    g_main_context_pop_thread_default(_context);
  }

 private:
  GMainContext* _context;
};

KeychainError inWords(const std::string& during, const GError& error) {
  const auto failure = [&](KeychainErrorCode code, std::string_view reason) {
    std::string text = "cannot " + during + ": ";
    return KeychainError(code, text.append(reason));
  };
  const GError* const each = &error;
  if (g_error_matches(each, G_IO_ERROR, G_IO_ERROR_CANCELLED) != FALSE) {
    return failure(KeychainErrorTimeout,
                   "the session's Secret Service did not answer in time; look whether it waits for a dialog");
  }
  if (g_error_matches(each, SECRET_ERROR, SECRET_ERROR_IS_LOCKED) != FALSE) {
    return failure(KeychainErrorLocked, "the session's keyring is locked; unlock it and try again");
  }
  if (g_error_matches(each, G_DBUS_ERROR, G_DBUS_ERROR_SERVICE_UNKNOWN) != FALSE ||
      g_error_matches(each, G_DBUS_ERROR, G_DBUS_ERROR_NAME_HAS_NO_OWNER) != FALSE) {
    return failure(KeychainErrorUnavailable,
                   "no Secret Service runs in this session; start one, or write keychain = \"vault\" into accountd.toml");
  }
  return failure(KeychainErrorUnavailable, std::string("the session's Secret Service failed (") + error.message + ")");
}

// Whether a session that has worked before may work again after it has been opened anew.
bool mayBeStale(const GError& error) {
  return g_error_matches(&error, G_IO_ERROR, G_IO_ERROR_CANCELLED) == FALSE &&
         g_error_matches(&error, SECRET_ERROR, SECRET_ERROR_IS_LOCKED) == FALSE;
}

}  // namespace

SecretServiceSession::SecretServiceSession(std::chrono::milliseconds timeLimit)
    : _timeLimit(timeLimit),
      _context(g_main_context_new()) {}

SecretServiceSession::~SecretServiceSession() {
  _service.reset();
  // What the service let go of is given back by the context's next round.
  while (g_main_context_iteration(_context.get(), FALSE) != FALSE) {
  }
}

void SecretServiceSession::run(const std::string& during, const Work& work) {
  const std::unique_lock lock(_mutex, _timeLimit);
  if (!lock.owns_lock()) {
    throw KeychainError(KeychainErrorTimeout, "cannot " + during + ": the session's Secret Service has been busy for too long");
  }
  const OwnContext context(_context.get());
  const TimeLimit timeLimit(_timeLimit);
  const bool isFresh = _service == nullptr;
  try {
    try {
      attempt(work, timeLimit.cancellable());
    } catch (const GFailure& failure) {
      _service.reset();
      if (isFresh || !mayBeStale(*failure.error)) throw;
      attempt(work, timeLimit.cancellable());
    }
  } catch (const GFailure& failure) {
    _service.reset();
    throw inWords(during, *failure.error);
  }
}

void SecretServiceSession::attempt(const Work& work, GCancellable* cancellable) {
  if (_service == nullptr) openService(cancellable);
  work(_service.get(), cancellable);
}

void SecretServiceSession::openService(GCancellable* cancellable) {
  GOutcome outcome;
  // When the bus goes, its connection would end the whole process.
  const GHandle<GDBusConnection> bus(g_bus_get_sync(G_BUS_TYPE_SESSION, cancellable, outcome.place()));
  outcome.check();
  if (g_dbus_connection_is_closed(bus.get()) != FALSE) {
    throw KeychainError(KeychainErrorUnavailable,
                        "cannot use the session's Secret Service: the session bus is gone; start again");
  }
  g_dbus_connection_set_exit_on_close(bus.get(), FALSE);

  GHandle<SecretService> service(
      secret_service_open_sync(SECRET_TYPE_SERVICE, nullptr, SECRET_SERVICE_OPEN_SESSION, cancellable, outcome.place()));
  outcome.check();
  const char* const algorithms = secret_service_get_session_algorithms(service.get());
  if (algorithms == nullptr || algorithms != encryptedSession) {
    throw KeychainError(KeychainErrorUnavailable,
                        "cannot use the session's Secret Service: it would take secrets over the bus unencrypted");
  }
  _service = std::move(service);
}

}  // namespace palisade
