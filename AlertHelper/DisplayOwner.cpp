#include "AlertHelper/DisplayOwner.h"

#include <sys/socket.h>

#include "Host/Alert/OwnServer.h"

#ifdef GDK_WINDOWING_X11
#include <gdk/gdkx.h>
#endif
#ifdef GDK_WINDOWING_WAYLAND
#include <gdk/gdkwayland.h>
#endif

namespace palisade {
namespace {

bool isOnThisMachine(int connection) {
  int family = 0;
  socklen_t size = sizeof family;
  return getsockopt(connection, SOL_SOCKET, SO_DOMAIN, &family, &size) == 0 && family == AF_UNIX;
}

}  // namespace

bool isTrustedDisplay(GdkDisplay* display, [[maybe_unused]] const std::string& networkDisplay) {
#ifdef GDK_WINDOWING_WAYLAND
  if (GDK_IS_WAYLAND_DISPLAY(display)) return isOwnServer(wl_display_get_fd(gdk_wayland_display_get_wl_display(display)));
#endif
#ifdef GDK_WINDOWING_X11
  if (GDK_IS_X11_DISPLAY(display)) {
    const int connection = ConnectionNumber(gdk_x11_display_get_xdisplay(display));
    return isOnThisMachine(connection) ? isOwnServer(connection)
                                       : !networkDisplay.empty() && gdk_display_get_name(display) == networkDisplay;
  }
#endif
  return false;
}

}  // namespace palisade
