#pragma once

/// What the keys of this display ask an alert for.
///
/// Threads: GTK's one. Errors: none; what is not understood is a key like any other.

#include <gdk/gdk.h>

#include "AlertHelper/AlertKeyboard.h"
#include "AlertHelper/Labels.h"

namespace palisade {

/// `isRightToLeft`: Allow stands to the left of Don't Allow.
KeyMeaning meaningOf(const GdkEventKey& key, const ButtonLabels& labels, bool isRightToLeft);

}  // namespace palisade
