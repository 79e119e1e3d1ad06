#include <gtest/gtest.h>
#include <pthread.h>
#include <unistd.h>

#include <atomic>
#include <csignal>
#include <memory>
#include <string>
#include <thread>

#include "StreamCapture.h"
#include "ui/terminal/CTerminalWindowController.h"

namespace {

const std::string kRedraw = "\r\033[2K";

TEST(TerminalWindow, DrawsTheStatusLineInPlaceOnATerminal) {
  OutputCapture out;
  InputText in("");
  auto window = std::make_unique<CTerminalWindowController>(out.Stream(), in.Stream());
  window->SetOutputIsTerminal(true);  // of a width it cannot tell: 80 columns
  window->initForDialog(true);
  window->setStatusColor(ESTATUS_COLOR_YELLOW);
  EXPECT_EQ(out.Take(), "");

  window->setStatusProgress(25);
  EXPECT_EQ(out.Take(), kRedraw + "[###..........]  25%");
  window->setStatusProgress(25.9);  // same picture: not drawn again
  EXPECT_EQ(out.Take(), "");

  const std::string updating = "Updating, this may take several minutes";
  for (const char* dots : {".", "..", "..."}) {
    window->setStatusText(updating + dots);
    EXPECT_EQ(out.Take(), kRedraw + "[###..........]  25% " + updating + dots);
  }
  window->setStatusProgress(100);
  EXPECT_EQ(out.Take(), kRedraw + "[#############] 100% " + updating + "...");
  window->setStatusProgress(101);
  EXPECT_EQ(out.Take(), "");
  window->setStatusProgress(-5);
  EXPECT_EQ(out.Take(), kRedraw + "[.............]   0% " + updating + "...");

  // 30 columns: a bar of 5 cells and 29 characters in all, cut between
  // characters, not bytes.
  window->SetWidth(30);
  std::string umlauts;
  for (int count = 0; count < 20; ++count) umlauts += "ä";
  window->setStatusText(umlauts);
  EXPECT_EQ(out.Take(), kRedraw + "[.....]   0% " + umlauts.substr(0, 16 * 2));
  window->setStatusText("a\tb\nc");
  EXPECT_EQ(out.Take(), kRedraw + "[.....]   0% a b c");

  // An alert starts below the status line; the line comes back afterwards.
  EXPECT_EQ(window->ShowAlert({EALERT_STYLE_INFORMATIONAL, "Title", "Body", {"OK"}}), 0);
  EXPECT_EQ(out.Take(), "\nTitle\nBody\n[OK]\n");
  window->setStatusText("a\tb\nc");
  EXPECT_EQ(out.Take(), kRedraw + "[.....]   0% a b c");

  // The line is ended when the window goes, so the shell starts afresh.
  window.reset();
  EXPECT_EQ(out.Take(), "\n");
}

TEST(TerminalWindow, WritesShortPlainLinesWhenNotATerminal) {
  OutputCapture out;
  InputText in("");
  CTerminalWindowController window(out.Stream(), in.Stream());
  window.SetOutputIsTerminal(false);
  window.initForDialog(true);

  window.setStatusText("Waiting for Loader Mode");
  window.setStatusText("Waiting for Loader Mode");
  for (double percent : {0.0, 3.0, 9.9, 10.0, 15.0, 57.5, 100.0, 120.0}) {
    window.setStatusProgress(percent);
  }
  for (const char* dots : {".", "..", "...", "."}) {
    window.setStatusText(std::string("Updating, this may take several minutes") + dots);
  }
  window.setStatusProgress(0);  // the next board starts over
  window.setStatusText("");
  window.setStatusText("Programming Successful");

  EXPECT_EQ(out.Text(),
            "Waiting for Loader Mode\n"
            "[....................]   0%\n"
            "[##..................]  10%\n"
            "[###########.........]  57%\n"
            "[####################] 100%\n"
            "Updating, this may take several minutes.\n"
            "[....................]   0%\n"
            "Programming Successful\n");
}

const SAlert kQuestion{EALERT_STYLE_WARNING,
                       "Tavik Firmware Update Utility",
                       "Do you want to continue?",
                       {"Nein", "Ja"}};

TEST(TerminalWindow, YesNoQuestionsReadAnswersAndDefaultToNo) {
  const struct {
    const char* input;
    bool answer;
  } cases[] = {{"y\n", true},    {"yes\n", true}, {" YES \r\n", true},    {"ja\n", true},
               {"n\n", false},   {"no\n", false}, {"Nein\n", false},      {"\n", false},
               {"", false},      {"y", true},     {"maybe\nyes\n", true}, {"yess\nj\n", true},
               {"x\nn\n", false}};
  for (const auto& entry : cases) {
    OutputCapture out;
    InputText in(entry.input);
    CTerminalWindowController window(out.Stream(), in.Stream());
    window.SetInputIsTerminal(true);
    EXPECT_EQ(window.AskYesNo(kQuestion), entry.answer) << entry.input;
  }
}

struct sigaction CurrentAction(int signal_I) {
  struct sigaction action {};
  sigaction(signal_I, nullptr, &action);
  return action;
}

TEST(TerminalWindow, InterruptIsRefusedWhileClosingIsDisabledAndClosesOtherwise) {
  OutputCapture out;
  InputText in("");
  CTerminalWindowController window(out.Stream(), in.Stream());
  window.SetOutputIsTerminal(false);
  // What was there before (ignored under nohup) comes back afterwards.
  const auto interrupt = CurrentAction(SIGINT).sa_handler,
             hangUp = CurrentAction(SIGHUP).sa_handler;
  ASSERT_TRUE(window.SetCatchSignals(true));
  CTerminalWindowController other(out.Stream(), in.Stream());
  EXPECT_FALSE(other.SetCatchSignals(true));

  int closes = 0;
  window.SetCloseHandler([&] {
    ++closes;
    window.QuitMainLoop();
  });

  window.enableClose(false);
  raise(SIGINT);
  raise(SIGHUP);
  window.PostToMainLoop([&] { window.QuitMainLoop(); });
  window.RunMainLoop();
  EXPECT_EQ(closes, 0);
  EXPECT_EQ(out.Take(), "The update cannot be interrupted now. Please wait.\n");

  window.enableClose(true);
  raise(SIGINT);
  window.RunMainLoop();  // only the close handler ends it
  EXPECT_EQ(closes, 1);

  EXPECT_TRUE(window.SetCatchSignals(false));
  EXPECT_EQ(CurrentAction(SIGINT).sa_handler, interrupt);
  EXPECT_EQ(CurrentAction(SIGHUP).sa_handler, hangUp);
}

TEST(TerminalWindow, InterruptDuringAQuestionAnswersNo) {
  int fds[2];
  ASSERT_EQ(pipe(fds), 0);
  FILE* input = fdopen(fds[0], "r");
  OutputCapture out;
  CTerminalWindowController window(out.Stream(), input);
  window.SetInputIsTerminal(true);
  ASSERT_TRUE(window.SetCatchSignals(true));

  // The reader blocks on an empty pipe; keep interrupting it until it answers.
  std::atomic<bool> answered{false};
  const pthread_t reader = pthread_self();
  std::thread interrupter([&] {
    while (!answered) {
      pthread_kill(reader, SIGINT);
      usleep(20000);
    }
  });
  const bool answer = window.AskYesNo(kQuestion);
  answered = true;
  interrupter.join();
  window.SetCatchSignals(false);

  EXPECT_FALSE(answer);
  EXPECT_EQ(out.Take(), "Tavik Firmware Update Utility\nDo you want to continue?\n[y/N] \n");
  std::fclose(input);
  close(fds[1]);
}

}  // namespace
