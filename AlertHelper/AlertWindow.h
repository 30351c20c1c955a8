#pragma once

/// The window that asks: who wants what of which account, and two buttons.
///
/// What its texts say is data: nothing in them is read as markup. Threads: GTK's one. Ownership: owned by `main`; borrows the
/// question while it is made. Errors: none; whatever is not a meant press of a button answers nothing or `closed`.

#include <gtkmm/box.h>
#include <gtkmm/button.h>
#include <gtkmm/scrolledwindow.h>
#include <gtkmm/window.h>

#include <functional>

#include "AlertHelper/Arming.h"
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
  Gtk::Widget* detailsOf(const AlertSubject& subject, std::string_view languages);

  /// All input goes through here before a widget sees it.
  static void filter(GdkEvent* event, void* window);
  void filterEvent(GdkEvent* event);
  bool keyWentDown(const GdkEventKey& key);
  bool keyWentUp(const GdkEventKey& key);

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
  Arming _arming;
  Gtk::Box _frame;
  Gtk::ScrolledWindow _scroller;
  Gtk::Button _refuse;
  Gtk::Button _allow;
};

}  // namespace palisade
