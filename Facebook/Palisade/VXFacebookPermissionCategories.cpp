#include "Facebook/Palisade/VXFacebookPermissionCategories.h"

const char* const VXFacebookPermissionCategoryUnknown = "unknown";
const char* const VXFacebookPermissionCategoryBasicRead = "basic-read";
const char* const VXFacebookPermissionCategoryExtendedRead = "extended-read";
const char* const VXFacebookPermissionCategoryWrite = "write";
const char* const VXFacebookPermissionCategoryManage = "manage";
