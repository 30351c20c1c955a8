// The window's behaviour: what input reaches it, and when a button counts as pressed. How it looks is in AlertWindowLayout.cpp.
//
// Every event passes `filterEvent` before a widget sees it, so that `Arming` knows of all clicks, wherever they go, and
// `AlertKeyboard` of all keys. Of the keys GTK sees the modifiers alone: it underlines the buttons' letters while Alt is down.

#include "AlertHelper/AlertWindow.h"

#include <gdk/gdkkeysyms.h>
#include <glibmm/main.h>
#include <gtk/gtk.h>
#include <gtkmm/adjustment.h>

#include "AlertHelper/KeyMeanings.h"
#include "AlertHelper/Layer.h"
#include "AlertHelper/PressedKeys.h"

namespace palisade {
namespace {

constexpr unsigned lookEvery = 50;

// Where there is no keyboard (a tablet, say), no window ever has its focus, and there are no keys that could go astray.
bool hasKeyboard(GdkDisplay* display) {
  GList* keyboards = gdk_seat_get_slaves(gdk_display_get_default_seat(display), GDK_SEAT_CAPABILITY_KEYBOARD);
  const bool hasAny = keyboards != nullptr;
  g_list_free(keyboards);
  return hasAny;
}

}  // namespace

AlertWindow::AlertWindow(const AlertQuestion& question, std::function<void(AlertWord)> answer)
    : _answer(std::move(answer)),
      _isTopMost(question.topMost),
      _arming(std::chrono::steady_clock::now),
      _focus(std::chrono::steady_clock::now) {
  build(question);
  if (!question.subject) _focus.leaveOutDetails();
  _refuse.signal_clicked().connect([this] { this->answer(AlertWord::refused); });
  _allow.signal_clicked().connect([this] { allowClicked(); });
  signal_delete_event().connect([this](GdkEventAny*) {
    this->answer(AlertWord::closed);
    return true;
  });
  signal_set_focus().connect([this](Gtk::Widget* widget) { focusWasMoved(widget); });
  property_is_active().signal_changed().connect([this] { updateFocus(); });
  gdk_event_handler_set(&AlertWindow::filter, this, nullptr);
}

AlertWindow::~AlertWindow() {
  gdk_event_handler_set([](GdkEvent* event, void*) { gtk_main_do_event(event); }, nullptr, nullptr);
}

void AlertWindow::appear() {
  set_modal(true);
  set_keep_above(_isTopMost);
  set_type_hint(Gdk::WINDOW_TYPE_HINT_DIALOG);
  set_position(Gtk::WIN_POS_CENTER);
  add_events(Gdk::VISIBILITY_NOTIFY_MASK);
  _isLayer = _isTopMost && becomeLayer(*gobj());
  if (_isLayer) get_style_context()->add_class("layer");
  Glib::signal_timeout().connect([this] { return showWhetherArmed(); }, lookEvery);
  showWhetherArmed();
  show_all();
  showPlace();
  present();
}

void AlertWindow::filter(GdkEvent* event, void* window) { static_cast<AlertWindow*>(window)->filterEvent(event); }

void AlertWindow::filterEvent(GdkEvent* event) {
  const bool isOurs = get_window() && event->any.window != nullptr &&
                      gdk_window_get_effective_toplevel(event->any.window) == get_window()->gobj();
  switch (event->type) {
    case GDK_KEY_PRESS: {
      const KeyMeaning meaning = meaningOf(event->key, _labels, get_direction() == Gtk::TEXT_DIR_RTL);
      keyWentDown(event->key, meaning);
      if (meaning != KeyMeaning::modifier) return;
      break;
    }
    case GDK_KEY_RELEASE:
      keyWentUp(event->key);
      if (meaningOf(event->key, _labels, false) != KeyMeaning::modifier) return;
      break;
    case GDK_BUTTON_PRESS:
    case GDK_2BUTTON_PRESS:
    case GDK_3BUTTON_PRESS:
    case GDK_TOUCH_BEGIN:
      _isPointerDown = true;
      _arming.pointerWentDown();
      break;
    case GDK_VISIBILITY_NOTIFY:
      if (isOurs) _arming.setCovered(event->visibility.state != GDK_VISIBILITY_UNOBSCURED);
      break;
    case GDK_MAP:
      _arming.setVisible(true);
      updateFocus();
      break;
    case GDK_UNMAP: _arming.setVisible(false); break;
    case GDK_WINDOW_STATE:
      if (isOurs) {
        const unsigned hidden = GDK_WINDOW_STATE_ICONIFIED | GDK_WINDOW_STATE_WITHDRAWN;
        _arming.setVisible((event->window_state.new_window_state & hidden) == 0 && get_mapped());
      }
      break;
    default: break;
  }
  const GdkEventType type = event->type;
  gtk_main_do_event(event);
  if (type == GDK_BUTTON_RELEASE || type == GDK_TOUCH_END || type == GDK_TOUCH_CANCEL) _isPointerDown = false;
}

void AlertWindow::keyWentDown(const GdkEventKey& key, KeyMeaning meaning) {
  _keyboard.wentDown(key.hardware_keycode, meaning);
  if (key.keyval == GDK_KEY_Page_Up || key.keyval == GDK_KEY_Page_Down) scroll(key.keyval == GDK_KEY_Page_Up ? -1 : 1);
  showPlace();
}

void AlertWindow::keyWentUp(const GdkEventKey& key) {
  if (const auto word = _keyboard.wentUp(key.hardware_keycode)) answer(*word);
}

Gtk::Widget& AlertWindow::widgetAt(AlertPlace place) {
  switch (place) {
    case AlertPlace::details: return _details;
    case AlertPlace::refuse: return _refuse;
    case AlertPlace::allow: return _allow;
    case AlertPlace::text: break;
  }
  return _text;
}

void AlertWindow::showPlace() {
  Gtk::Widget& widget = widgetAt(_focus.place());
  // GTK shows the focus only after keys that it has seen.
  set_focus_visible(true);
  if (get_focus() == &widget) return;
  _isShowingPlace = true;
  widget.grab_focus();
  _isShowingPlace = false;
}

// Assistive technology moves GTK's focus by itself. Such a move has its wait like any other.
void AlertWindow::focusWasMoved(const Gtk::Widget* widget) {
  if (_isShowingPlace) return;
  for (const AlertPlace place : {AlertPlace::text, AlertPlace::details, AlertPlace::refuse, AlertPlace::allow}) {
    if (widget == &widgetAt(place)) _focus.putOn(place);
  }
}

void AlertWindow::allowClicked() {
  const Arming::Press press = _isPointerDown ? _arming.pointerWentUp() : _arming.pressedAtOnce();
  if (press == Arming::Press::armed) answer(AlertWord::allowed);
}

void AlertWindow::scroll(int pages) {
  const auto place = _scroller.get_vadjustment();
  place->set_value(place->get_value() + pages * place->get_page_increment());
}

// There is one answer: whatever is pressed while the window goes away was pressed too late.
void AlertWindow::answer(AlertWord word) {
  if (const auto first = std::exchange(_answer, nullptr)) first(word);
}

void AlertWindow::updateFocus() {
  const bool hasFocus = property_is_active().get_value() || !hasKeyboard(get_display()->gobj());
  if (hasFocus == _hadFocus) return;
  _hadFocus = hasFocus;
  _arming.setFocused(hasFocus);
  if (hasFocus) {
    _keyboard.windowCame(pressedKeys(get_display()->gobj()));
  } else {
    _keyboard.windowWent();
    showPlace();
  }
}

// The button looks as it behaves towards a click. It stays sensitive, so that the keyboard's focus can rest on it.
bool AlertWindow::showWhetherArmed() {
  const auto style = _allow.get_style_context();
  if (_arming.isArmed() && style->has_class("waiting")) {
    style->remove_class("waiting");
  } else if (!_arming.isArmed() && !style->has_class("waiting")) {
    style->add_class("waiting");
  }
  return true;
}

}  // namespace palisade
