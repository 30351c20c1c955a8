// How the window looks: icon, title, sentence, who asks and for what account, two buttons. The text and the details can have
// the keyboard's focus, too, and show it by a line around them.

#include <atkmm/object.h>
#include <gdkmm/monitor.h>
#include <giomm/desktopappinfo.h>
#include <gtk/gtk.h>
#include <gtkmm/cssprovider.h>
#include <gtkmm/icontheme.h>
#include <gtkmm/image.h>
#include <gtkmm/label.h>

#include "AlertHelper/AlertWindow.h"
#include "AlertHelper/Labels.h"
#include "Host/Alert/AlertWords.h"

namespace palisade {
namespace {

constexpr int charactersOfALine = 46;
constexpr int iconSize = 48;
constexpr int gap = 12;

constexpr const char* style = R"(
  .alert-title { font-size: 125%; font-weight: bold; }
  .alert-message { font-size: 105%; }
  .alert-claimed { font-weight: bold; }
  .alert-place { border: 1px solid transparent; border-radius: 5px; padding: 5px; }
  .alert-place:focus { border-color: alpha(@theme_fg_color, 0.4); }
  button { min-width: 6em; padding: 6px 14px; }
  button:focus { outline: 2px solid alpha(@theme_fg_color, 0.6); outline-offset: 1px; }
  button.waiting { opacity: 0.5; }
  window.layer { border-radius: 9px; border: 1px solid alpha(@theme_fg_color, 0.35); }
)";

// Without the hyphens that would show where a long word is broken: an identifier shows no letter that it does not have.
void showAsItIs(Gtk::Label& label) {
  PangoAttrList* attributes = pango_attr_list_new();
  pango_attr_list_insert(attributes, pango_attr_insert_hyphens_new(FALSE));
  gtk_label_set_attributes(label.gobj(), attributes);
  pango_attr_list_unref(attributes);
}

Gtk::Label* makeLabel(const Glib::ustring& text, const char* styleClass, int characters = charactersOfALine) {
  auto* label = Gtk::make_managed<Gtk::Label>();
  label->set_text(text);
  label->set_line_wrap(true);
  label->set_line_wrap_mode(Pango::WRAP_WORD_CHAR);
  label->set_max_width_chars(characters);
  label->set_xalign(0);
  showAsItIs(*label);
  label->get_style_context()->add_class(styleClass);
  return label;
}

// Between U+2068 and U+2069: an identifier stays in one piece beside words of the other direction.
Glib::ustring isolatedText(const std::string& text) { return Glib::ustring("\u2068") + text + "\u2069"; }

// The application's own icon, where the desktop knows the application; otherwise the one of a key.
Gtk::Image* makeIcon(const std::optional<AlertSubject>& subject) {
  auto* image = Gtk::make_managed<Gtk::Image>();
  image->set_from_icon_name("dialog-password", Gtk::ICON_SIZE_DIALOG);
  if (subject && subject->applicationID.find('/') == std::string::npos) {
    const auto theme = Gtk::IconTheme::get_default();
    const auto entry = Gio::DesktopAppInfo::create(subject->applicationID + ".desktop");
    const Glib::RefPtr<const Gio::Icon> icon = entry ? entry->get_icon() : Glib::RefPtr<Gio::Icon>();
    if (icon && theme->lookup_icon(icon, iconSize, Gtk::ICON_LOOKUP_FORCE_SIZE)) {
      image->set(icon, Gtk::ICON_SIZE_DIALOG);
    } else if (theme->has_icon(subject->applicationID)) {
      image->set_from_icon_name(subject->applicationID, Gtk::ICON_SIZE_DIALOG);
    }
  }
  image->set_pixel_size(iconSize);
  image->set_valign(Gtk::ALIGN_START);
  return image;
}

void useStyle() {
  const auto provider = Gtk::CssProvider::create();
  provider->load_from_data(style);
  Gtk::StyleContext::add_provider_for_screen(Gdk::Screen::get_default(), provider, GTK_STYLE_PROVIDER_PRIORITY_APPLICATION);
}

// As wide as it would like to be, and as high as it then is, but no higher than that: left alone, GTK asks for the height of
// texts that are broken into more lines than they will be.
void fitTo(Gtk::ScrolledWindow& scroller, Gtk::Widget& content, int mostHigh) {
  content.show_all();
  int least = 0;
  int width = 0;
  int height = 0;
  content.get_preferred_width(least, width);
  content.get_preferred_height_for_width(width, least, height);
  content.set_size_request(width, -1);
  scroller.set_min_content_height(std::min(height, mostHigh));
}

// A part of the window that can have the keyboard's focus, and which assistive technology then reads.
void makePlace(Gtk::Widget& widget, const std::string& name) {
  widget.set_can_focus(true);
  widget.get_style_context()->add_class("alert-place");
  widget.get_accessible()->set_name(name);
}

void setUpButton(Gtk::Button& button, const std::string& label, const std::string& name) {
  button.set_focus_on_click(false);
  button.set_use_underline(true);
  button.set_label(label);
  button.get_accessible()->set_name(name);
}

}  // namespace

void AlertWindow::build(const AlertQuestion& question) {
  useStyle();
  Gtk::Widget::set_default_direction(alertWordsFor(question.languages).isRightToLeft() ? Gtk::TEXT_DIR_RTL : Gtk::TEXT_DIR_LTR);
  set_title(question.title);
  set_resizable(false);
  get_accessible()->set_role(Atk::ROLE_ALERT);
  get_accessible()->set_name(question.title);
  get_accessible()->set_description(question.message);

  _text.set_orientation(Gtk::ORIENTATION_VERTICAL);
  _text.set_spacing(gap);
  _text.pack_start(*makeLabel(question.title, "alert-title"), Gtk::PACK_SHRINK);
  auto* message = makeLabel(question.message, "alert-message");
  message->set_width_chars(charactersOfALine);
  _text.pack_start(*message, Gtk::PACK_SHRINK);
  makePlace(_text, question.title + " " + question.message);

  auto* texts = Gtk::make_managed<Gtk::Box>(Gtk::ORIENTATION_VERTICAL, gap / 3);
  texts->pack_start(_text, Gtk::PACK_SHRINK);
  if (question.subject) {
    fillDetails(*question.subject, question.languages);
    texts->pack_start(_details, Gtk::PACK_SHRINK);
  }

  auto* content = Gtk::make_managed<Gtk::Box>(Gtk::ORIENTATION_HORIZONTAL, gap + gap / 2);
  content->pack_start(*makeIcon(question.subject), Gtk::PACK_SHRINK);
  content->pack_start(*texts, Gtk::PACK_EXPAND_WIDGET);

  // A long sentence on a small screen scrolls; the buttons stay where they can be seen.
  // It takes no focus itself; Page Up and Page Down scroll it.
  _scroller.set_can_focus(false);
  _scroller.set_policy(Gtk::POLICY_NEVER, Gtk::POLICY_AUTOMATIC);
  _scroller.add(*content);

  _labels = buttonLabels(question.refuseTitle, question.allowTitle);
  setUpButton(_refuse, _labels.refuse, question.refuseTitle);
  setUpButton(_allow, _labels.allow, question.allowTitle);
  _allow.get_style_context()->add_class("suggested-action");
  _allow.set_can_default(true);
  auto* buttons = Gtk::make_managed<Gtk::Box>(Gtk::ORIENTATION_HORIZONTAL, gap);
  buttons->pack_end(_allow, Gtk::PACK_SHRINK);
  buttons->pack_end(_refuse, Gtk::PACK_SHRINK);

  _frame.set_orientation(Gtk::ORIENTATION_VERTICAL);
  _frame.set_spacing(2 * gap);
  _frame.set_border_width(2 * gap);
  _frame.pack_start(_scroller, Gtk::PACK_EXPAND_WIDGET);
  _frame.pack_start(*buttons, Gtk::PACK_SHRINK);
  add(_frame);
  set_default(_allow);

  Gdk::Rectangle area;
  if (const auto monitor = get_display()->get_monitor(0)) monitor->get_workarea(area);
  fitTo(_scroller, *content, std::max(area.get_height() - 12 * gap, 10 * gap));
}

void AlertWindow::fillDetails(const AlertSubject& subject, std::string_view languages) {
  const AlertWords& words = alertWordsFor(languages);
  _details.set_column_spacing(gap);
  _details.set_row_spacing(gap / 2);
  std::string spoken;
  int row = 0;
  const auto addRow = [&](std::string_view name, const Glib::ustring& text, const char* styleClass) {
    auto* title = makeLabel(std::string(name), "dim-label", charactersOfALine / 2);
    title->set_valign(Gtk::ALIGN_START);
    auto* value = makeLabel(text, styleClass, charactersOfALine * 2 / 3);
    if (!name.empty()) value->get_accessible()->set_name(Glib::ustring(std::string(name)) + ": " + text);
    _details.attach(*title, 0, row, 1, 1);
    _details.attach(*value, 1, row, 1, 1);
    spoken += (spoken.empty() ? "" : ", ") + std::string(name) + (name.empty() ? "" : ": ") + text;
    ++row;
  };
  // The identifier has a line of its own, so that each keeps to its side in either direction of writing.
  addRow(words.application, isolatedText(subject.applicationName), "alert-detail");
  if (subject.applicationID != subject.applicationName) addRow("", isolatedText(subject.applicationID), "alert-detail");
  addRow(words.identity, std::string(words.wordFor(subject.certainty)),
         isOnlyClaimed(subject.certainty) ? "alert-claimed" : "alert-certain");
  if (!subject.account.empty()) addRow(words.account, isolatedText(subject.account), "alert-detail");
  makePlace(_details, spoken);
}

}  // namespace palisade
