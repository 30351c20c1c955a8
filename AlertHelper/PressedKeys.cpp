#include "AlertHelper/PressedKeys.h"

#ifdef GDK_WINDOWING_X11
#include <gdk/gdkx.h>
#endif

namespace palisade {

std::set<unsigned> pressedKeys([[maybe_unused]] GdkDisplay* display) {
  std::set<unsigned> keys;
#ifdef GDK_WINDOWING_X11
  if (GDK_IS_X11_DISPLAY(display)) {
    char bits[32] = {};
    XQueryKeymap(gdk_x11_display_get_xdisplay(display), bits);
    for (unsigned key = 0; key < 8 * sizeof bits; ++key) {
      if ((static_cast<unsigned char>(bits[key / 8]) >> key % 8 & 1) != 0) keys.insert(key);
    }
  }
#endif
  return keys;
}

}  // namespace palisade
