// palisade-alert: asks the person in front of the screen one question for the account daemon, which starts it.
//
// Its only words go over the socket that it was started with, and it says one thing at most. Whatever else becomes of it, a
// crash, a lost display, the daemon's end, is nobody's answer: the daemon takes a silent or unclean end for that.

#include <glibmm/main.h>
#include <gtk/gtk.h>
#include <gtkmm/main.h>
#include <sys/prctl.h>

#include <csignal>
#include <cstdio>

#include "AlertHelper/AlertWindow.h"
#include "AlertHelper/DisplayOwner.h"
#include "AlertHelper/HostConnection.h"

namespace {

constexpr int inheritedSocket = 3;

enum ExitStatus : int { answered = 0, unanswered = 2, noDisplay = 3, noQuestion = 4 };

int ask(const palisade::AlertQuestion& question, const palisade::HostConnection& host) {
  int status = unanswered;
  palisade::AlertWindow window(question, [&](palisade::AlertWord word) {
    status = host.answer(question.nonce, word) ? answered : unanswered;
    gtk_main_quit();
  });
  const auto hostIsGone = Glib::signal_io().connect(
      [](Glib::IOCondition) {
        gtk_main_quit();
        return false;
      },
      host.descriptor(), Glib::IO_IN | Glib::IO_HUP | Glib::IO_ERR);
  window.appear();
  gtk_main();
  return status;
}

}  // namespace

int main(int argumentCount, char** arguments) {
  // Nobody may read the question's number out of this process, and the window goes away with the daemon even if it hangs.
  prctl(PR_SET_DUMPABLE, 0, 0, 0, 0);
  prctl(PR_SET_PDEATHSIG, SIGKILL, 0, 0, 0);

  const palisade::HostConnection host(inheritedSocket);
  const auto question = host.receiveQuestion();
  if (!question) {
    std::fputs("palisade-alert is started by accountd, which tells it what to ask.\n", stderr);
    return noQuestion;
  }
  g_set_prgname("palisade-alert");
  if (gtk_init_check(&argumentCount, &arguments) == FALSE) {
    std::fputs("palisade-alert: the display cannot be used.\n", stderr);
    return noDisplay;
  }
  if (!palisade::isTrustedDisplay(gdk_display_get_default(), question->networkDisplay)) {
    std::fputs("palisade-alert: the display belongs to another user, or is reached over the network.\n", stderr);
    return noDisplay;
  }
  Gtk::Main::init_gtkmm_internals();
  return ask(*question, host);
}
