/// A module whose entry point breaks its promise not to throw.

#include <stdexcept>

#include "Platform/AccountAccessPlugin.h"

extern "C" PALISADE_EXPORT const palisade::AccountAccessPluginModule* accountAccessPluginModule(std::uint32_t) {
  throw std::runtime_error("not today");
}
