#include "ui/terminal/CTerminalWindowController.h"

#include <sys/ioctl.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <cmath>
#include <csignal>
#include <cstdlib>
#include <utility>

#include "common/StringUtilities.h"
#include "common/TavLog.h"
#include "host/CLanguageManager.h"
#include "ui/terminal/CTerminalMainLoop.h"

namespace {

// Back to the line's start, then erase the whole line.
constexpr const char* kRedrawLine = "\r\033[2K";
constexpr int kDefaultColumns = 80;
// The bar takes a sixth of the line, within these bounds, leaving room for
// the longest status texts on an 80-column terminal.
constexpr int kMinBarCells = 5;
constexpr int kMaxBarCells = 30;
// The plain form's bar, the same in every log.
constexpr int kPlainBarCells = 20;
constexpr const char* kAcknowledgeButton = "OK";

double ClampPercent(double percent_I) {
  if (!(percent_I >= 0.0)) return 0.0;  // also NaN
  return std::min(percent_I, 100.0);
}

std::string RenderBar(double percent_I, int cells_I) {
  const int filled = static_cast<int>(std::floor(ClampPercent(percent_I) * cells_I / 100.0));
  // Built by appending: GCC 12 at -O3 misreads a chain of "+" here as an
  // overlapping copy.
  std::string bar;
  bar.reserve(static_cast<size_t>(cells_I) + 2);
  bar += '[';
  bar.append(static_cast<size_t>(filled), '#');
  bar.append(static_cast<size_t>(cells_I - filled), '.');
  bar += ']';
  return bar;
}

std::string RenderPercent(double percent_I) {
  return StringUtilities::Format("%3d%%", static_cast<int>(std::floor(ClampPercent(percent_I))));
}

// Control characters would break the line drawn in place.
std::string OneLine(const std::string& text_I) {
  std::string line = text_I;
  for (char& character : line) {
    const unsigned char byte = static_cast<unsigned char>(character);
    if (byte < 0x20 || byte == 0x7F) character = ' ';
  }
  return line;
}

// Cuts after `columns_I` characters, never inside a UTF-8 sequence. One
// character is taken as one column.
std::string CutToColumns(const std::string& text_I, int columns_I) {
  int characters = 0;
  for (size_t position = 0; position < text_I.size(); ++position) {
    const bool starts = (static_cast<unsigned char>(text_I[position]) & 0xC0) != 0x80;
    if (starts && ++characters > columns_I) return text_I.substr(0, position);
  }
  return text_I;
}

std::string WithoutTrailingDots(const std::string& text_I) {
  const size_t end = text_I.find_last_not_of('.');
  return end == std::string::npos ? std::string() : text_I.substr(0, end + 1);
}

std::string T(const char* key_I) { return TTCLocalizedNSString(key_I); }

// The button's word, or its first letter where the other button does not
// start with the same one. Compared without case.
bool IsWordOrInitial(const std::string& answer_I, const std::string& button_I,
                     const std::string& other_I) {
  if (button_I.empty()) return false;
  if (StringUtilities::IEquals(answer_I, button_I)) return true;
  const std::string initial = StringUtilities::ToLower_Copy(button_I.substr(0, 1));
  const std::string otherInitial = StringUtilities::ToLower_Copy(other_I.substr(0, 1));
  return answer_I == initial && initial != otherInitial;
}

bool IsTerminal(FILE* stream_I) { return stream_I != nullptr && isatty(fileno(stream_I)) == 1; }

}  // namespace

CTerminalWindowController::CTerminalWindowController() : CTerminalWindowController(stdout, stdin) {
  SetCatchSignals(true);
}

CTerminalWindowController::CTerminalWindowController(FILE* output_I, FILE* input_I)
    : mOutput(output_I),
      mInput(input_I),
      mOutputIsTerminal(IsTerminal(output_I)),
      mInputIsTerminal(IsTerminal(input_I)),
      mLoop(std::make_unique<CTerminalMainLoop>()) {}

CTerminalWindowController::~CTerminalWindowController() {
  EndStatusLine();
  std::fflush(mOutput);
}

bool CTerminalWindowController::SetCatchSignals(bool catch_I) {
  if (!catch_I) {
    mLoop->ReleaseSignals();
    return true;
  }
  return mLoop->CatchSignals([this](int signal_I) { OnSignal(signal_I); });
}

void CTerminalWindowController::initForDialog(bool /*commandLine_I*/) {
  // A terminal has only the update dialog's status line and bar.
  EndStatusLine();
  mStatusText.clear();
  mProgress = 0.0;
  mStatusGiven = false;
  mDrawnLine.clear();
  mPlainTextKey.clear();
  mPlainTenth = -1;
  mCloseEnabled = true;
}

void CTerminalWindowController::showWindow() {}

void CTerminalWindowController::enableClose(bool enable_I) {
  mCloseEnabled = enable_I;
  if (!enable_I || mDeferredSignal == 0) return;
  const int signal = std::exchange(mDeferredSignal, 0);
  // Posted, not run here: the state that enabled closing finishes first,
  // and a run that ends by itself keeps its own outcome.
  mLoop->Post([this, signal] { OnSignal(signal); });
}

void CTerminalWindowController::SetCloseHandler(std::function<void()> handler_I) {
  mCloseHandler = std::move(handler_I);
}

void CTerminalWindowController::setStatusText(const std::string& text_I) {
  mStatusText = text_I;
  mStatusGiven = true;
  if (mOutputIsTerminal) {
    DrawStatusLine();
  } else {
    WritePlainStatusText();
  }
}

void CTerminalWindowController::setStatusProgress(double percent_I) {
  mProgress = ClampPercent(percent_I);
  mStatusGiven = true;
  if (mOutputIsTerminal) {
    DrawStatusLine();
  } else {
    WritePlainProgress();
  }
}

void CTerminalWindowController::setStatusColor(ESTATUS_COLOR /*color_I*/) {}

// The terminal shows the update dialog, which has no header and no board
// panel, so these have nothing to show.
void CTerminalWindowController::setTabletName(const std::string& /*name_I*/) {}
void CTerminalWindowController::setBoardArray(const std::vector<std::string>& /*boards_I*/) {}
void CTerminalWindowController::setPenFirmwareVersion(uint32_t /*version_I*/) {}
void CTerminalWindowController::setPenOldChecksum(uint32_t /*checksum_I*/) {}
void CTerminalWindowController::setPenNewChecksum(uint32_t /*checksum_I*/) {}
void CTerminalWindowController::setTouchFirmwareVersion(uint32_t /*version_I*/) {}
void CTerminalWindowController::setTouchOldChecksum(uint32_t /*checksum_I*/) {}
void CTerminalWindowController::setTouchNewChecksum(uint32_t /*checksum_I*/) {}
void CTerminalWindowController::enableUIElements(bool /*enable_I*/) {}
void CTerminalWindowController::enableProgramButton(bool /*enable_I*/) {}

void CTerminalWindowController::PrintLine(FILE* stream_I, const std::string& text_I) {
  EndStatusLine();
  std::fflush(mOutput);
  std::fputs((text_I + "\n").c_str(), stream_I);
  std::fflush(stream_I);
}

int CTerminalWindowController::ShowAlert(const SAlert& alert_I) {
  EndStatusLine();
  WriteAlertText(alert_I);
  std::vector<std::string> buttons = alert_I.buttons;
  if (buttons.empty()) buttons.push_back(kAcknowledgeButton);
  std::string row;
  for (const std::string& button : buttons) {
    row += (row.empty() ? "[" : " [") + OneLine(button) + "]";
  }
  Write(row + "\n");
  if (buttons.size() == 1) return 0;
  if (!mInputIsTerminal) {
    Write("-> " + OneLine(buttons[0]) + " " + T("(standard input is not a terminal)") + "\n");
    return 0;
  }
  const std::string prompt =
      StringUtilities::Format(T("Choose 1-%zu [1]: ").c_str(), buttons.size());
  for (;;) {
    Write(prompt);
    std::string line;
    const EAnswer answer = ReadAnswer(line);
    if (answer == EAnswer::eAskAgain) continue;
    if (answer == EAnswer::eEnd) {
      Write("\n");
      return 0;
    }
    StringUtilities::Trim(line);
    if (line.empty()) return 0;
    char* end = nullptr;
    const long number = std::strtol(line.c_str(), &end, 10);
    if (*end == '\0' && number >= 1 && number <= static_cast<long>(buttons.size())) {
      return static_cast<int>(number - 1);
    }
    for (size_t index = 0; index < buttons.size(); ++index) {
      if (StringUtilities::IEquals(line, buttons[index])) return static_cast<int>(index);
    }
    Write(
        StringUtilities::Format(T("Please type a number from 1 to %zu.").c_str(), buttons.size()) +
        "\n");
  }
}

bool CTerminalWindowController::AskYesNo(const SAlert& question_I) {
  EndStatusLine();
  WriteAlertText(question_I);
  if (mAssumeYes) {
    Write(T("[y/N]") + " " + T("y (assumed)") + "\n");
    return true;
  }
  if (!mInputIsTerminal) {
    Write(T("[y/N]") + " " + T("n (standard input is not a terminal)") + "\n");
    return false;
  }
  const std::string noButton = question_I.buttons.size() > 0 ? question_I.buttons[0] : "";
  const std::string yesButton = question_I.buttons.size() > 1 ? question_I.buttons[1] : "";
  for (;;) {
    Write(T("[y/N]") + " ");
    std::string line;
    const EAnswer answer = ReadAnswer(line);
    if (answer == EAnswer::eAskAgain) continue;
    if (answer == EAnswer::eEnd) {
      Write("\n");
      return false;
    }
    StringUtilities::Trim(line);
    StringUtilities::ToLower(line);
    // The answer's own language counts too: "j" and "ja" where the buttons
    // say "Ja" and "Nein".
    const bool yes = line == "y" || line == "yes" || IsWordOrInitial(line, yesButton, noButton);
    if (yes) return true;
    if (line.empty() || line == "n" || line == "no" || IsWordOrInitial(line, noButton, yesButton)) {
      return false;
    }
    Write(T("Please answer y or n.") + "\n");
  }
}

void CTerminalWindowController::RunMainLoop() { mLoop->Run(); }

void CTerminalWindowController::QuitMainLoop() { mLoop->Quit(); }

void CTerminalWindowController::PostToMainLoop(std::function<void()> task_I) {
  mLoop->Post(std::move(task_I));
}

void CTerminalWindowController::PostToMainLoopAfter(double delay_I, std::function<void()> task_I) {
  mLoop->PostAfter(delay_I, std::move(task_I));
}

bool CTerminalWindowController::IsMainLoopThread() const { return mLoop->IsLoopThread(); }

void CTerminalWindowController::DrawStatusLine() {
  const int columns = GetColumns();
  const int cells = std::clamp(columns / 6, kMinBarCells, kMaxBarCells);
  std::string line = RenderBar(mProgress, cells);
  line += ' ';
  line += RenderPercent(mProgress);
  if (!mStatusText.empty()) {
    line += ' ';
    line += OneLine(mStatusText);
  }
  // The last column stays free: writing into it makes some terminals wrap,
  // and the carriage return would then redraw the wrong line.
  line = CutToColumns(line, columns - 1);
  if (mLineOnScreen && line == mDrawnLine) return;
  Write(std::string(kRedrawLine).append(line));
  mDrawnLine = line;
  mLineOnScreen = true;
}

void CTerminalWindowController::WritePlainStatusText() {
  const std::string key = WithoutTrailingDots(mStatusText);
  if (key == mPlainTextKey) return;
  mPlainTextKey = key;
  if (!mStatusText.empty()) Write(OneLine(mStatusText) + "\n");
}

void CTerminalWindowController::WritePlainProgress() {
  const int tenth = static_cast<int>(std::floor(mProgress / 10.0));
  if (tenth == mPlainTenth) return;
  mPlainTenth = tenth;
  Write(RenderBar(mProgress, kPlainBarCells) + " " + RenderPercent(mProgress) + "\n");
}

void CTerminalWindowController::EndStatusLine() {
  if (!mLineOnScreen) return;
  Write("\n");
  mLineOnScreen = false;
  mDrawnLine.clear();
}

void CTerminalWindowController::WriteAlertText(const SAlert& alert_I) {
  if (!alert_I.message.empty()) Write(alert_I.message + "\n");
  if (!alert_I.informativeText.empty()) Write(alert_I.informativeText + "\n");
}

CTerminalWindowController::EAnswer CTerminalWindowController::ReadAnswer(std::string& line_O) {
  // A Ctrl-C typed just before the read began counts like one during it.
  int signal = mLoop->TakeSignal();
  if (signal == 0) {
    char* buffer = nullptr;
    size_t capacity = 0;
    errno = 0;
    const ssize_t length = getline(&buffer, &capacity, mInput);
    const int readError = errno;
    if (length >= 0) line_O.assign(buffer, static_cast<size_t>(length));
    std::free(buffer);
    if (length >= 0) {
      while (!line_O.empty() && (line_O.back() == '\n' || line_O.back() == '\r')) {
        line_O.pop_back();
      }
      return EAnswer::eLine;
    }
    const bool interrupted = std::ferror(mInput) && readError == EINTR;
    std::clearerr(mInput);
    if (!interrupted) return EAnswer::eEnd;
    signal = mLoop->TakeSignal();
    if (signal == 0) return EAnswer::eAskAgain;  // a signal of someone else's
  }
  if (mCloseEnabled) return EAnswer::eEnd;  // the question's safe answer
  Write("\n");
  OnSignal(signal);
  return EAnswer::eAskAgain;
}

void CTerminalWindowController::OnSignal(int signal_I) {
  if (mCloseEnabled) {
    if (mCloseHandler) {
      mCloseHandler();
    } else {
      QuitMainLoop();
    }
    return;
  }
  if (signal_I == SIGHUP || signal_I == SIGTERM) {
    // The terminal, the session or the machine is going away; the board
    // must not be left in its loader, so the end waits for it.
    TavLog::Warning("%s deferred: closing is disabled while the update runs\n",
                    signal_I == SIGHUP ? "Hang-up" : "Terminate");
    mDeferredSignal = signal_I;
    return;
  }
  TavLog::Warning("Interrupt refused: closing is disabled while the update runs\n");
  EndStatusLine();
  Write(T("The update cannot be interrupted now. Please wait.") + "\n");
  if (mStatusGiven && mOutputIsTerminal) DrawStatusLine();
}

int CTerminalWindowController::GetColumns() const {
  if (mColumns > 0) return mColumns;
  struct winsize size {};
  if (mOutput != nullptr && ioctl(fileno(mOutput), TIOCGWINSZ, &size) == 0 && size.ws_col > 0) {
    return size.ws_col;
  }
  return kDefaultColumns;
}

void CTerminalWindowController::Write(const std::string& text_I) {
  std::fwrite(text_I.data(), 1, text_I.size(), mOutput);
  std::fflush(mOutput);
}
