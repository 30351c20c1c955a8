#include "AlertHelper/Layer.h"

#ifdef PALISADE_LAYER_SHELL
#include <gtk-layer-shell/gtk-layer-shell.h>
#endif

namespace palisade {

#ifdef PALISADE_LAYER_SHELL
bool becomeLayer(GtkWindow& window) {
  if (gtk_layer_is_supported() == FALSE) return false;
  gtk_layer_init_for_window(&window);
  gtk_layer_set_namespace(&window, "palisade-alert");
  gtk_layer_set_layer(&window, GTK_LAYER_SHELL_LAYER_OVERLAY);
  gtk_layer_set_keyboard_mode(&window, GTK_LAYER_SHELL_KEYBOARD_MODE_EXCLUSIVE);
  return true;
}
#else
bool becomeLayer(GtkWindow&) { return false; }
#endif

}  // namespace palisade
