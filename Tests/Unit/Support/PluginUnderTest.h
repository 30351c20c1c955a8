#pragma once

/// The plug-in with the operations of its own in reach of a test.

#include "Facebook/Palisade/VXFacebookAccountAccessPlugin.h"

namespace palisade {

class PluginUnderTest final : public VXFacebookAccountAccessPlugin {
 public:
  using VXFacebookAccountAccessPlugin::VXFacebookAccountAccessPlugin;

  using VXFacebookAccountAccessPlugin::_accountOfType;

  using VXFacebookAccountAccessPlugin::_shouldIgnoreAccessRequest;

  using VXFacebookAccountAccessPlugin::_appIDFromOptionsDictionary;
  using VXFacebookAccountAccessPlugin::_audienceFromOptionsDictionary;
  using VXFacebookAccountAccessPlugin::_csvStringFromSet;
  using VXFacebookAccountAccessPlugin::_permissionsFromOptionsDictionary;
  using VXFacebookAccountAccessPlugin::_persistentDictionaryForOptions;
  using VXFacebookAccountAccessPlugin::_validateOptionsDictionary;

  using VXFacebookAccountAccessPlugin::_allPermissionsInCategory;
  using VXFacebookAccountAccessPlugin::_allReadPermissions;
  using VXFacebookAccountAccessPlugin::_basicReadPermissions;
  using VXFacebookAccountAccessPlugin::_extendedReadPermissions;
  using VXFacebookAccountAccessPlugin::_managePermissions;
  using VXFacebookAccountAccessPlugin::_userProfileReadPermissions;
  using VXFacebookAccountAccessPlugin::_writePermissions;

  using VXFacebookAccountAccessPlugin::_commaSeparatedListWithFormat;
  using VXFacebookAccountAccessPlugin::_friendObjectsRequestedByPermissions;
  using VXFacebookAccountAccessPlugin::_localizedString;
  using VXFacebookAccountAccessPlugin::_objectNameForManagePermission;
  using VXFacebookAccountAccessPlugin::_objectNameForReadPermission;
  using VXFacebookAccountAccessPlugin::_predicateForPermissions;
  using VXFacebookAccountAccessPlugin::_userFriendlyAudienceString;
  using VXFacebookAccountAccessPlugin::_userObjectsRequestedByPermissions;

  using VXFacebookAccountAccessPlugin::_constructUserMessageForPermissions;

  using VXFacebookAccountAccessPlugin::_appendDescriptionOfUnknownPermissions;
  using VXFacebookAccountAccessPlugin::_fetchDescriptionForUnknownPermissions;

  using VXFacebookAccountAccessPlugin::_promptUserToApproveRequestForPermissions;
  using VXFacebookAccountAccessPlugin::_showAlertWithMessage;
  using VXFacebookAccountAccessPlugin::_showUserNotificationWithTitle;

  using VXFacebookAccountAccessPlugin::_handleUserResponse;

  using VXFacebookAccountAccessPlugin::_getServerAuthorizationForClient;
  using VXFacebookAccountAccessPlugin::_masterTokenForAccount;
  using VXFacebookAccountAccessPlugin::_serverAudienceStringForAudience;

  using VXFacebookAccountAccessPlugin::_saveCredentialForClient;
};

}  // namespace palisade
