#include "app/CCommandLine.h"

#include <cctype>

#include "app/CFirmwareReportCommand.h"
#include "app/TavVersion.h"
#include "common/StringUtilities.h"
#include "host/CLanguageManager.h"
#include "lab/CLabOptions.h"
#include "lab/CLabProducts.h"

namespace {

enum class EValue { eNone, eRequired, eOptional };

struct SOptionRule {
  const char* name;
  EValue value;
};

// Every option the program knows, and whether a value follows it.
constexpr SOptionRule kOptions[] = {
    {"--help", EValue::eNone},
    {"-h", EValue::eNone},
    {"--version", EValue::eNone},
    {"--verbose", EValue::eNone},
    {"-v", EValue::eNone},
    {"--log", EValue::eRequired},
    {"--inspect", EValue::eRequired},
    {"--interface", EValue::eRequired},
    {"--output-binary", EValue::eRequired},
    {"--json", EValue::eNone},
    {"--list", EValue::eNone},
    {"--all", EValue::eNone},
    {"--headless", EValue::eNone},
    {"--yes", EValue::eNone},
    {"--lab-fast", EValue::eNone},
    {"--lab-fault", EValue::eRequired},
    {"--lab-state", EValue::eRequired},
    {"--lab", EValue::eOptional},
    {"-p", EValue::eRequired},
    {"-t", EValue::eRequired},
    {"-b", EValue::eRequired},
    {"-s", EValue::eRequired},
    {"-f", EValue::eRequired},
};

const SOptionRule* FindRule(const std::string& name_I) {
  for (const SOptionRule& rule : kOptions) {
    if (name_I == rule.name) return &rule;
  }
  return nullptr;
}

bool IsBoardOption(const std::string& name_I) {
  return name_I == "-p" || name_I == "-t" || name_I == "-b" || name_I == "-s";
}

bool IsDecimal(const std::string& text_I) {
  if (text_I.empty() || text_I.size() > 10) return false;
  for (char c : text_I) {
    if (!std::isdigit(static_cast<unsigned char>(c))) return false;
  }
  return std::stoull(text_I) <= 0xFFFFFFFFull;
}

// An interface path: the five numbers of --list joined by ":". A scalar
// behind the bridge is named by its display instead: vendor and product in
// decimal, then the serial number and the index.
bool IsBoardValue(const std::string& option_I, const std::string& value_I) {
  if (value_I.empty()) return true;
  const std::vector<std::string> parts = StringUtilities::Tokenize(value_I, ":", false);
  if (option_I == "-s") {
    return parts.size() >= 2 && parts.size() <= 4 && IsDecimal(parts[0]) && IsDecimal(parts[1]);
  }
  if (parts.size() != 5) return false;
  for (const std::string& part : parts) {
    if (!IsDecimal(part)) return false;
  }
  return true;
}

std::string T(const char* key_I) { return TTCLocalizedNSString(key_I); }

}  // namespace

bool CCommandLine::Fail(const std::string& text_I) {
  mError = text_I;
  return false;
}

bool CCommandLine::Parse(const std::vector<std::string>& arguments_I) {
  for (size_t i = 0; i < arguments_I.size(); ++i) {
    std::string name = arguments_I[i];
    std::string value;
    bool valueGiven = false;
    // Long options also take their value as --name=VALUE.
    const size_t equals = name.find('=');
    if (name.rfind("--", 0) == 0 && equals != std::string::npos) {
      value = name.substr(equals + 1);
      name.resize(equals);
      valueGiven = true;
    }
    const SOptionRule* rule = FindRule(name);
    if (rule == nullptr) {
      if (name.size() > 1 && name[0] == '-') return Fail("unknown option " + name);
      return Fail("unexpected argument \"" + name + "\"; board values follow -p, -t, -b or -s");
    }
    if (valueGiven && rule->value == EValue::eNone) return Fail(name + " takes no value");
    if (!valueGiven && rule->value == EValue::eRequired) {
      // A board value never starts with "-": that is the next option.
      const bool next = i + 1 < arguments_I.size();
      if (!next ||
          (IsBoardOption(name) && !arguments_I[i + 1].empty() && arguments_I[i + 1][0] == '-')) {
        if (IsBoardOption(name)) {
          return Fail(name +
                      " needs a value: an interface path from --list, or \"\" for the "
                      "one found");
        }
        return Fail(name + " needs a value");
      }
      value = arguments_I[++i];
      valueGiven = true;
    }
    if (!valueGiven && rule->value == EValue::eOptional && i + 1 < arguments_I.size() &&
        !arguments_I[i + 1].empty() && arguments_I[i + 1][0] != '-') {
      // The product name after --lab is optional: a word that is no option.
      value = arguments_I[++i];
      valueGiven = true;
    }
    if (!Take(name, value, valueGiven)) return false;
  }
  return CheckCombinations();
}

bool CCommandLine::Take(const std::string& name_I, const std::string& value_I, bool given_I) {
  if (name_I == "--help" || name_I == "-h") {
    mHelp = true;
  } else if (name_I == "--version") {
    mVersion = true;
  } else if (name_I == "--verbose" || name_I == "-v") {
    mVerbose = true;
  } else if (name_I == "--log") {
    mLogFile = value_I;
  } else if (name_I == "--inspect") {
    mInspectFile = value_I;
  } else if (name_I == "--interface") {
    EINTERFACE_TYPE type;
    if (!CFirmwareReportCommand::ParseInterface(value_I, type)) {
      return Fail("unknown interface " + value_I + ": use hid, bulk, i2c or ftdi");
    }
    mInspectInterface = value_I;
  } else if (name_I == "--output-binary") {
    mInspectOutputBinary = value_I;
  } else if (name_I == "--json") {
    mInspectJson = true;
  } else if (name_I == "--list") {
    mList = true;
  } else if (name_I == "--all") {
    mAll = true;
  } else if (name_I == "--headless") {
    mHeadless = true;
  } else if (name_I == "--yes") {
    mYes = true;
  } else if (name_I == "--lab-fast") {
    mLabFast = true;
  } else if (name_I == "--lab-fault") {
    std::string error;
    if (!CLabOptions().AddFault(value_I, error))
      return Fail("--lab-fault " + value_I + ": " + error);
    mLabFaults.push_back(value_I);
  } else if (name_I == "--lab-state") {
    if (value_I.empty()) return Fail("--lab-state needs a folder");
    mLabState = value_I;
  } else if (name_I == "--lab") {
    mLab = true;
    if (given_I) mLabName = value_I;
    if (given_I && value_I != "list" && !CLabProducts::IsKnown(value_I)) {
      return Fail("there is no lab product called " + value_I + "; --lab list names them");
    }
  } else {
    // -p, -t, -b, -s and -f go to the updater as they came.
    if (IsBoardOption(name_I) && !IsBoardValue(name_I, value_I)) {
      return Fail(name_I + " " + value_I + ": " +
                  (name_I == "-s" ? "not a display (VENDOR:PRODUCT:SERIAL:INDEX, or \"\")"
                                  : "not an interface path (five numbers joined by \":\" as "
                                    "--list shows them, or \"\")"));
    }
    if (name_I == "-f" && value_I.empty()) return Fail("-f needs the path of a configuration");
    mUpdaterArguments.push_back(name_I);
    mUpdaterArguments.push_back(value_I);
  }
  return true;
}

bool CCommandLine::CheckCombinations() {
  if (mInspectFile.empty() && (!mInspectInterface.empty() || !mInspectOutputBinary.empty())) {
    return Fail("--interface and --output-binary go with --inspect");
  }
  if (mInspectJson && mInspectFile.empty() && !mList && !HasBoardOption() && !mAll) {
    return Fail("--json goes with --inspect, --list, --all or a board option");
  }
  if (!mLab && (mLabFast || !mLabFaults.empty() || !mLabState.empty())) {
    return Fail("--lab-fault, --lab-state and --lab-fast go with --lab");
  }
  if (mList && !mInspectFile.empty()) return Fail("--list and --inspect do not go together");
  if ((mList || !mInspectFile.empty()) && (HasBoardOption() || mAll)) {
    return Fail("-p, -t, -b, -s and --all update boards; they do not go with --list or --inspect");
  }
  if (mAll && HasBoardOption())
    return Fail("--all updates every board; give it without -p, -t, -b or -s");
  return true;
}

bool CCommandLine::HasBoardOption() const {
  for (size_t i = 0; i < mUpdaterArguments.size(); i += 2) {
    if (IsBoardOption(mUpdaterArguments[i])) return true;
  }
  return false;
}

bool CCommandLine::GetLabListRequested() const { return mLab && mLabName == "list"; }

std::string CCommandLine::HelpText() {
  return StringUtilities::Format(
      T("Usage: %s [options] [-p PATH] [-t PATH] [-b PATH] [-s DISPLAY] [-f CONFIG]\n"
        "       %s [options] --all\n"
        "\n"
        "Updates the firmware of a pen tablet or pen display.\n"
        "\n"
        "Boards to update, one update each, in the given order:\n"
        "  -p PATH       the pen controller\n"
        "  -t PATH       the touch controller\n"
        "  -b PATH       the Bluetooth module\n"
        "  -s DISPLAY    the display scalar\n"
        "                PATH is an interface path as --list shows it, or \"\" for the\n"
        "                board found; DISPLAY is VENDOR:PRODUCT:SERIAL:INDEX, or \"\"\n"
        "      --all     every board of every product found for which the configuration\n"
        "                names a firmware file: pen, touch, Bluetooth, then scalar;\n"
        "                a board already at the file's version is skipped\n"
        "  -f CONFIG     path of the device configuration (fw_loader.ini)\n"
        "\n"
        "Options:\n"
        "  -h, --help            show this text and exit\n"
        "      --version         show the version and exit\n"
        "  -v, --verbose         write log lines to standard error\n"
        "      --log FILE        append log lines to FILE\n"
        "      --headless        no window\n"
        "      --yes             answer the confirmation with yes\n"
        "      --json            with an update, end with a JSON report on standard\n"
        "                        output; the terminal text goes to standard error\n"
        "\n"
        "Looking at a firmware file, without touching a device:\n"
        "      --inspect FILE        load FILE as an update would and show its content\n"
        "      --interface NAME      hid (default), bulk, i2c or ftdi; decides how .bin is read\n"
        "      --output-binary PATH  write the loaded image to PATH as flat bytes\n"
        "      --json                show the content as one JSON object\n"
        "\n"
        "Finding devices, without updating them:\n"
        "      --list                show each tablet or pen display found and its boards\n"
        "      --json                with --list, show the result as one JSON object\n"
        "\n"
        "The lab, built-in emulated products in place of USB:\n"
        "      --lab [NAME]          use the lab; NAME picks a product (default\n"
        "                            wireless-tablet); --lab list names them all\n"
        "      --lab-fault KIND@N    inject a fault (repeatable): vanish@N, fail-read@N,\n"
        "                            fail-write@N, stall@N, busy@N, refuse-switch, bad-crc@N,\n"
        "                            flaky@N; on a display's FTDI scalar also nak@N,\n"
        "                            stuck-busy, crc-mismatch@N, refuse-open, not-ready@N,\n"
        "                            stale@N, no-reply@N; KIND@N:BOARD names one board\n"
        "      --lab-state DIR       where the lab keeps its boards between runs\n"
        "      --lab-fast            run the lab on a virtual clock: no real waiting\n"
        "\n"
        "Exit status of a run in the terminal: 0 every board asked for was updated,\n"
        "1 an update failed, 2 no device or board found, 3 firmware file refused,\n"
        "4 not confirmed, 64 wrong usage.\n")
          .c_str(),
      TAV_PROGRAM_NAME, TAV_PROGRAM_NAME);
}
