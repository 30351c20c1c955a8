#include "AlertHelper/KeyMeanings.h"

#include <gdk/gdkkeysyms.h>

#include <algorithm>
#include <span>

namespace palisade {
namespace {

// Whether the key types that letter in any of the keyboard's layouts: Latin ones often stand beside others.
bool types(const GdkEventKey& key, char letter) {
  if (letter == 0) return false;
  GdkKeymap* keymap = gdk_keymap_get_for_display(gdk_window_get_display(key.window));
  guint* symbols = nullptr;
  gint count = 0;
  if (gdk_keymap_get_entries_for_keycode(keymap, key.hardware_keycode, nullptr, &symbols, &count) == FALSE) return false;
  const bool found = std::ranges::any_of(std::span(symbols, static_cast<std::size_t>(count)), [&](guint symbol) {
    return gdk_keyval_to_lower(symbol) == static_cast<guint>(letter);
  });
  g_free(symbols);
  return found;
}

KeyMeaning meaningAlone(guint symbol, bool isRightToLeft) {
  switch (symbol) {
    case GDK_KEY_Tab:
    case GDK_KEY_KP_Tab: return KeyMeaning::forward;
    case GDK_KEY_Left:
    case GDK_KEY_KP_Left: return isRightToLeft ? KeyMeaning::crossToAllow : KeyMeaning::crossToRefuse;
    case GDK_KEY_Right:
    case GDK_KEY_KP_Right: return isRightToLeft ? KeyMeaning::crossToRefuse : KeyMeaning::crossToAllow;
    case GDK_KEY_Return:
    case GDK_KEY_KP_Enter:
    case GDK_KEY_ISO_Enter:
    case GDK_KEY_space:
    case GDK_KEY_KP_Space: return KeyMeaning::press;
    case GDK_KEY_Escape: return KeyMeaning::close;
    default: return KeyMeaning::other;
  }
}

bool isModifier(guint symbol) {
  return (symbol >= GDK_KEY_Shift_L && symbol <= GDK_KEY_Hyper_R) || symbol == GDK_KEY_ISO_Level3_Shift ||
         symbol == GDK_KEY_ISO_Level5_Shift || symbol == GDK_KEY_Num_Lock;
}

}  // namespace

KeyMeaning meaningOf(const GdkEventKey& key, const ButtonLabels& labels, bool isRightToLeft) {
  if (key.is_modifier != 0 || isModifier(key.keyval)) return KeyMeaning::modifier;
  constexpr guint counted = GDK_SHIFT_MASK | GDK_CONTROL_MASK | GDK_MOD1_MASK | GDK_SUPER_MASK | GDK_HYPER_MASK | GDK_META_MASK;
  const guint modifiers = key.state & counted & ~(key.state & GDK_MOD1_MASK ? GDK_META_MASK : 0);
  if (modifiers == 0) return meaningAlone(key.keyval, isRightToLeft);
  if (modifiers == GDK_SHIFT_MASK && (key.keyval == GDK_KEY_Tab || key.keyval == GDK_KEY_ISO_Left_Tab)) return KeyMeaning::back;
  if (modifiers == GDK_MOD1_MASK && types(key, labels.allowLetter)) return KeyMeaning::towardsAllow;
  if (modifiers == GDK_MOD1_MASK && types(key, labels.refuseLetter)) return KeyMeaning::towardsRefuse;
  return KeyMeaning::other;
}

}  // namespace palisade
