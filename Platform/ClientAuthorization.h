#pragma once

/// The record of what one client was granted or refused for one account type.
///
/// Threads: not synchronised; a record belongs to whoever made it or looked it up. The store hands out detached copies: only an
/// accepted `AuthorizationManager::setAuthorization` changes what is stored.
/// Ownership: options and permissions are immutable and shared.

#include <memory>
#include <utility>

#include "Platform/PermissionSet.h"
#include "Platform/Value.h"

namespace palisade {

class Client;

class ClientAuthorization {
 public:
  explicit ClientAuthorization(std::shared_ptr<const Client> client) : _client(std::move(client)) {}

  const std::shared_ptr<const Client>& client() const { return _client; }

  bool isGranted() const { return _isGranted; }
  void setIsGranted(bool isGranted) { _isGranted = isGranted; }

  /// The reduced copy of the client's options that the grant keeps, or none.
  const std::shared_ptr<const Dictionary>& options() const { return _options; }
  void setOptions(std::shared_ptr<const Dictionary> options) { _options = std::move(options); }

  /// The permissions that the client holds, or none (a refused record holds none).
  const PermissionSetRef& grantedPermissions() const { return _grantedPermissions; }
  void setGrantedPermissions(PermissionSetRef permissions) { _grantedPermissions = std::move(permissions); }

 private:
  std::shared_ptr<const Client> _client;
  bool _isGranted = false;
  std::shared_ptr<const Dictionary> _options;
  PermissionSetRef _grantedPermissions;
};

}  // namespace palisade
