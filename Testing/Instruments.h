#pragma once

/// What every fake is made with: where it records its calls, and what makes them fail. Both outlive the fake.

#include "Testing/FaultInjector.h"
#include "Testing/Trace.h"

namespace palisade {

struct Instruments {
  Trace& trace;
  FaultInjector& faults;
};

}  // namespace palisade
