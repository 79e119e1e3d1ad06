#pragma once
// The window of an update run, as the application state machine drives it.
// One form draws it with widgets, another on a terminal; the state machine
// knows only this class.
//
// Threads: the main thread is the one that makes the window; it alone calls
// RunMainLoop. Every operation except PostToMainLoop, PostToMainLoopAfter,
// QuitMainLoop and IsMainLoopThread belongs to it. Other threads reach the
// window by posting a task.
//
// Texts: the window draws the texts it is given as they are. Everything the
// state machine shows has been through TTCLocalizedNSString already; a form
// may add a few words of its own (a terminal's "[y/N]", for example).
//
// A use, on the main thread:
//
//   window.initForDialog(true);
//   window.showWindow();
//   window.SetCloseHandler([&] { Terminate(); });
//   SAlert question{EALERT_STYLE_WARNING, TTCLocalizedNSString("..."), body,
//                   {TTCLocalizedNSString("No"), TTCLocalizedNSString("Yes")}};
//   if (!window.AskYesNo(question)) return Terminate();
//   window.setStatusColor(ESTATUS_COLOR_YELLOW);
//   window.setStatusText(TTCLocalizedNSString("Waiting for Loader Mode"));
//   window.RunMainLoop();  // until QuitMainLoop

#include <cstdint>
#include <functional>
#include <string>
#include <vector>

// The colours the states give the status line.
enum ESTATUS_COLOR {
  ESTATUS_COLOR_LIGHT_GRAY = 0,  // no update running
  ESTATUS_COLOR_YELLOW = 1,      // waiting or programming
  ESTATUS_COLOR_GREEN = 2,       // success
  ESTATUS_COLOR_RED = 3,         // failure
};

// How an alert presents itself. The numbers are those of the desktop
// alert styles the texts were written for.
enum EALERT_STYLE {
  EALERT_STYLE_WARNING = 0,
  EALERT_STYLE_INFORMATIONAL = 1,
  EALERT_STYLE_CRITICAL = 2,
};

// A modal alert: a short message in bold, a longer informative text under
// it, and its buttons from left to right.
struct SAlert {
  EALERT_STYLE style = EALERT_STYLE_WARNING;
  std::string message;
  std::string informativeText;
  std::vector<std::string> buttons;
};

class CWindowController {
 public:
  virtual ~CWindowController() = default;

  // Builds the window. `commandLine_I` true gives the update dialog (status
  // text and progress bar only); false gives the full dialog, which adds
  // the tablet header and the board panel. Afterwards the status text is
  // empty, the progress 0 and closing enabled. Called once, first.
  virtual void initForDialog(bool commandLine_I) = 0;
  // Makes the window visible and brings it to the front.
  virtual void showWindow() = 0;

  // Whether the user may close the window (its close button and menus; on a
  // terminal, interrupt and hang-up). While disabled a request to close is
  // refused, so a running update cannot be cut off by the user.
  virtual void enableClose(bool enable_I) = 0;
  // Runs on the main thread when the user asks to close while closing is
  // enabled. Closing the window ends the program, so the state machine
  // passes its terminate step here. Without a handler the main loop quits.
  virtual void SetCloseHandler(std::function<void()> handler_I) = 0;

  // The status line. A text replaces the previous one at once; a text that
  // differs from the last only in its trailing dots is the same status
  // animated, and a form that writes a log may show it once.
  virtual void setStatusText(const std::string& text_I) = 0;
  // Progress in percent, 0 to 100; forms clamp values outside. Shown at
  // once, as it arrives inside a synchronous dispatch from the update thread.
  virtual void setStatusProgress(double percent_I) = 0;
  // The states' colour for the status line. The original window shows no
  // colour at all; a form may do the same, but the calls are kept.
  virtual void setStatusColor(ESTATUS_COLOR color_I) = 0;

  // The full dialog's header and board panel. Each does nothing in the
  // update dialog, which has neither.
  virtual void setTabletName(const std::string& name_I) = 0;
  // Board names as the updater knows them ("Pen", "Touch", "Bluetooth",
  // "Scalar"); a form that translates them for display must hand the
  // untranslated name back to the updater.
  virtual void setBoardArray(const std::vector<std::string>& boards_I) = 0;
  // Versions and checksums as the device interface reports them
  // (a version of 0xFFFFFFFF: unknown).
  virtual void setPenFirmwareVersion(uint32_t version_I) = 0;
  virtual void setPenOldChecksum(uint32_t checksum_I) = 0;
  virtual void setPenNewChecksum(uint32_t checksum_I) = 0;
  virtual void setTouchFirmwareVersion(uint32_t version_I) = 0;
  virtual void setTouchOldChecksum(uint32_t checksum_I) = 0;
  virtual void setTouchNewChecksum(uint32_t checksum_I) = 0;
  virtual void enableUIElements(bool enable_I) = 0;
  virtual void enableProgramButton(bool enable_I) = 0;

  // A modal alert; returns the index of the chosen button in
  // `alert_I.buttons`. An empty list gets one acknowledging button of the
  // form's own and answers 0. Where nobody can answer (no terminal, no
  // display) the answer is 0, the first button.
  virtual int ShowAlert(const SAlert& alert_I) = 0;
  // A modal question with `buttons` {no, yes}, the safe answer first.
  // True only when the user chose yes; closing, end of input and "nobody
  // can answer" are no, unless the form was told to assume yes.
  virtual bool AskYesNo(const SAlert& question_I) = 0;
  // The confirmation before a scalar is written through its bridge, with
  // `buttons` {cancel, update}. A form with windows gives it a window of its
  // own; otherwise it is asked like any question.
  virtual bool RunScalarConfirmation(const SAlert& question_I) { return AskYesNo(question_I); }

  // The main thread's task loop. RunMainLoop runs posted tasks one at a
  // time, in the order they were posted, until QuitMainLoop; a Quit made
  // while no loop runs makes the next RunMainLoop return at once. Tasks
  // still queued at a quit stay queued.
  virtual void RunMainLoop() = 0;
  virtual void QuitMainLoop() = 0;
  virtual void PostToMainLoop(std::function<void()> task_I) = 0;
  // Posts the task once `delay_I` seconds of the clock seam have passed.
  virtual void PostToMainLoopAfter(double delay_I, std::function<void()> task_I) = 0;
  // True on the main thread, whether or not its loop is running yet, so a
  // dispatch from the main thread itself can run its task at once.
  virtual bool IsMainLoopThread() const = 0;
};
