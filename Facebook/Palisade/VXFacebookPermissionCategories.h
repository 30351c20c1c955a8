#pragma once

/// The names of the permission categories, exported by the module for whoever loads it (plain C strings, never null).
/// "unknown" names what is in no category; no operation answers it.

#include "Platform/AccountAccessPlugin.h"

extern "C" {
PALISADE_EXPORT extern const char* const VXFacebookPermissionCategoryUnknown;
PALISADE_EXPORT extern const char* const VXFacebookPermissionCategoryBasicRead;
PALISADE_EXPORT extern const char* const VXFacebookPermissionCategoryExtendedRead;
PALISADE_EXPORT extern const char* const VXFacebookPermissionCategoryWrite;
PALISADE_EXPORT extern const char* const VXFacebookPermissionCategoryManage;
}
