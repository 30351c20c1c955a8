#pragma once

/// An open, encrypted session with the desktop's Secret Service, and the library behind it. Only
/// `SecretServiceHalves` and its session include this.
///
/// Threads: any, one operation at a time; whoever comes while one runs waits for it, within its own time limit.
/// Ownership: what the library hands out is owned by the handles below. Errors: `KeychainError`. An operation ends within twice
/// the time limit, whatever the service does; a session that the service has forgotten is opened again once.

#include <libsecret/secret.h>

#include <chrono>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <utility>

namespace palisade {

/// Gives back what the library handed out.
struct GHandleRelease {
  void operator()(gchar* text) const { g_free(text); }
  void operator()(GHashTable* table) const { g_hash_table_unref(table); }
  void operator()(GMainContext* context) const { g_main_context_unref(context); }
  void operator()(SecretValue* value) const { secret_value_unref(value); }
  void operator()(SecretSchema* schema) const { secret_schema_unref(schema); }
  void operator()(GList* objects) const { g_list_free_full(objects, g_object_unref); }
  template <typename Object>
  void operator()(Object* object) const {
    g_object_unref(object);
  }
};
template <typename Content>
using GHandle = std::unique_ptr<Content, GHandleRelease>;

/// What a call of the library failed with.
struct GFailure {
  std::shared_ptr<const GError> error;
};

/// Where one call of the library puts its error: pass `outcome.place()`, then `check`, which throws `GFailure`.
class GOutcome {
 public:
  GOutcome() = default;
  GOutcome(const GOutcome&) = delete;
  GOutcome& operator=(const GOutcome&) = delete;
  ~GOutcome() { g_clear_error(&_error); }

  GError** place() { return &_error; }
  void check() {
    if (_error != nullptr) throw GFailure{std::shared_ptr<GError>(std::exchange(_error, nullptr), g_error_free)};
  }

 private:
  GError* _error = nullptr;
};

class SecretServiceSession {
 public:
  explicit SecretServiceSession(std::chrono::milliseconds timeLimit);
  ~SecretServiceSession();

  /// Does `work(service, cancellable)`, which throws `GFailure` or `KeychainError`. `during` completes "cannot ...".
  using Work = std::function<void(SecretService*, GCancellable*)>;
  void run(const std::string& during, const Work& work);

 private:
  void openService(GCancellable* cancellable);
  void attempt(const Work& work, GCancellable* cancellable);

  const std::chrono::milliseconds _timeLimit;
  std::timed_mutex _mutex;
  // Below: used under _mutex.
  GHandle<GMainContext> _context;
  GHandle<SecretService> _service;
};

}  // namespace palisade
