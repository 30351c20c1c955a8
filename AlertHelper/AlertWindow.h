#pragma once

/// The window that asks: who wants what of which account, and two buttons.
///
/// What its texts say is data: nothing in them is read as markup. No key reaches a widget: where the keyboard stands, and what
/// it presses there, is decided by `AlertKeyboard`, and GTK's focus follows. Threads: GTK's one. Ownership: owned by `main`;
/// borrows the question while it is made. Errors: none; whatever is not a meant press of a button answers nothing or `closed`.

#include <gtkmm/box.h>
#include <gtkmm/button.h>
#include <gtkmm/grid.h>
#include <gtkmm/scrolledwindow.h>
#include <gtkmm/window.h>

#include <functional>

#include "AlertHelper/AlertKeyboard.h"
#include "AlertHelper/Arming.h"
#include "AlertHelper/Labels.h"
#include "Host/Alert/AlertFocus.h"
#include "Host/Alert/AlertQuestion.h"

namespace palisade {

class AlertWindow final : public Gtk::Window {
 public:
  AlertWindow(const AlertQuestion& question, std::function<void(AlertWord)> answer);
  ~AlertWindow() override;

  /// Shows the window, above all others where the display allows it.
  void appear();

 private:
  void build(const AlertQuestion& question);
  void fillDetails(const AlertSubject& subject, std::string_view languages);

  /// All input goes through here before a widget sees it.
  static void filter(GdkEvent* event, void* window);
  void filterEvent(GdkEvent* event);
  void keyWentDown(const GdkEventKey& key, KeyMeaning meaning);
  void keyWentUp(const GdkEventKey& key);

  Gtk::Widget& widgetAt(AlertPlace place);
  void showPlace();
  void focusWasMoved(const Gtk::Widget* widget);
  void scroll(int pages);
  void answer(AlertWord word);
  void allowClicked();
  void updateFocus();
  bool showWhetherArmed();

  std::function<void(AlertWord)> _answer;
  bool _isTopMost;
  bool _isLayer = false;
  bool _isPointerDown = false;
  bool _hadFocus = false;
  bool _isShowingPlace = false;
  Arming _arming;
  AlertFocus _focus;
  AlertKeyboard _keyboard{_arming, _focus};
  ButtonLabels _labels;
  Gtk::Box _frame;
  Gtk::ScrolledWindow _scroller;
  Gtk::Box _text;
  Gtk::Grid _details;
  Gtk::Button _refuse;
  Gtk::Button _allow;
};

}  // namespace palisade
