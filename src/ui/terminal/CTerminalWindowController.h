#pragma once
// The update window on a terminal, for runs without a display.
//
// On a terminal the status is one line redrawn in place: a carriage return,
// the erase-line sequence, then "[#####.....]  50% <status text>", cut to
// the terminal's width (asked of the terminal at each draw, 80 when it
// cannot tell). Nothing is drawn until the first status text or progress.
// When the output is not a terminal (a pipe, a log file) it writes plain
// lines instead: a status text when it changes, where texts that differ
// only in their trailing dots count as one, and the progress only when it
// enters another tenth, so logs stay short.
//
// Alerts and questions print their message, informative text and buttons.
// A question reads its answer from the input: y, yes or the yes button's
// text for yes; n, no, the no button's text, an empty line or the end of
// input for no; anything else asks again. With "assume yes" it answers yes
// without reading. When the input is not a terminal and "assume yes" is
// off, nobody can answer: a question is answered no and an alert with its
// first button, and the answer is printed with the reason.
//
// Closing the window maps to the interrupt, hang-up and terminate signals,
// caught by the main loop: while closing is enabled they run the close
// handler (an interrupt during a question answers it with its safe
// answer). While it is disabled, that is while a board is on its way into
// its loader, in it or on its way out, Ctrl-C is refused, so it cannot cut
// off a running update; a hang-up or a terminate (a closed terminal, a
// session or a machine shutting down) is kept and takes effect once
// closing is enabled again, after the board has left its loader.
// Ctrl-\ still ends the process at once, as a last resort.
//
// Its few words of its own ("[y/N]", the not-interactive notes, the refusal
// to interrupt) come from the catalogs like every other text; a question
// also takes the first letter of its translated buttons ("j" in German).
// Status colours have no visible effect, as in the original window.

#include <cstdio>
#include <memory>
#include <string>

#include "update/CWindowController.h"

class CTerminalMainLoop;

class CTerminalWindowController : public CWindowController {
 public:
  // Standard output and input; catches the interrupt and hang-up signals
  // while it lives.
  CTerminalWindowController();
  // The given streams (borrowed), terminals detected from them; signals are
  // left alone unless SetCatchSignals(true).
  CTerminalWindowController(FILE* output_I, FILE* input_I);
  ~CTerminalWindowController() override;

  // For a --yes option: questions are answered yes without asking.
  void SetAssumeYes(bool assumeYes_I) { mAssumeYes = assumeYes_I; }
  void SetOutputIsTerminal(bool terminal_I) { mOutputIsTerminal = terminal_I; }
  void SetInputIsTerminal(bool terminal_I) { mInputIsTerminal = terminal_I; }
  // Columns of the terminal; 0 asks the terminal.
  void SetWidth(int columns_I) { mColumns = columns_I; }
  // False when another window holds the signals already.
  bool SetCatchSignals(bool catch_I);

  void initForDialog(bool commandLine_I) override;
  void showWindow() override;
  void enableClose(bool enable_I) override;
  void SetCloseHandler(std::function<void()> handler_I) override;

  void setStatusText(const std::string& text_I) override;
  void setStatusProgress(double percent_I) override;
  void setStatusColor(ESTATUS_COLOR color_I) override;

  void setTabletName(const std::string& name_I) override;
  void setBoardArray(const std::vector<std::string>& boards_I) override;
  void setPenFirmwareVersion(uint32_t version_I) override;
  void setPenOldChecksum(uint32_t checksum_I) override;
  void setPenNewChecksum(uint32_t checksum_I) override;
  void setTouchFirmwareVersion(uint32_t version_I) override;
  void setTouchOldChecksum(uint32_t checksum_I) override;
  void setTouchNewChecksum(uint32_t checksum_I) override;
  void enableUIElements(bool enable_I) override;
  void enableProgramButton(bool enable_I) override;

  // A line of the run's own report on `stream_I`, below the status line.
  void PrintLine(FILE* stream_I, const std::string& text_I);

  int ShowAlert(const SAlert& alert_I) override;
  bool AskYesNo(const SAlert& question_I) override;

  void RunMainLoop() override;
  void QuitMainLoop() override;
  void PostToMainLoop(std::function<void()> task_I) override;
  void PostToMainLoopAfter(double delay_I, std::function<void()> task_I) override;
  bool IsMainLoopThread() const override;

 private:
  enum class EAnswer { eLine, eEnd, eAskAgain };

  void DrawStatusLine();
  void WritePlainStatusText();
  void WritePlainProgress();
  void EndStatusLine();
  void WriteAlertText(const SAlert& alert_I);
  EAnswer ReadAnswer(std::string& line_O);
  void OnSignal(int signal_I);
  int GetColumns() const;
  void Write(const std::string& text_I);

  FILE* mOutput;
  FILE* mInput;
  bool mOutputIsTerminal;
  bool mInputIsTerminal;
  int mColumns = 0;
  bool mAssumeYes = false;
  bool mCloseEnabled = true;
  // A hang-up or terminate that came while closing was disabled, or 0.
  int mDeferredSignal = 0;
  std::function<void()> mCloseHandler;
  std::unique_ptr<CTerminalMainLoop> mLoop;

  std::string mStatusText;
  double mProgress = 0.0;
  bool mStatusGiven = false;   // a status text or progress came since initForDialog
  bool mLineOnScreen = false;  // a status line without its new line is showing
  std::string mDrawnLine;      // the status line last drawn, to skip redraws
  std::string mPlainTextKey;   // the last plain status text without its dots
  int mPlainTenth = -1;        // the last plain progress tenth written
};
