/// A module that calls a function which nobody defines: it can be linked, but not loaded.

#include "Platform/AccountAccessPlugin.h"

extern "C" const palisade::AccountAccessPluginModule* functionThatNobodyDefines();

extern "C" PALISADE_EXPORT const palisade::AccountAccessPluginModule* accountAccessPluginModule(std::uint32_t) {
  return functionThatNobodyDefines();
}
