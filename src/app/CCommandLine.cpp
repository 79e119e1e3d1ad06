#include "app/CCommandLine.h"

#include "app/TavVersion.h"

bool CCommandLine::Parse(const std::vector<std::string>& arguments_I) {
  for (size_t i = 0; i < arguments_I.size(); ++i) {
    const std::string& argument = arguments_I[i];
    if (argument == "--help" || argument == "-h") {
      mHelp = true;
    } else if (argument == "--version") {
      mVersion = true;
    } else if (argument == "--verbose" || argument == "-v") {
      mVerbose = true;
    } else if (argument == "--log") {
      if (i + 1 >= arguments_I.size()) {
        mError = "--log needs a file name";
        return false;
      }
      mLogFile = arguments_I[++i];
    } else if (argument == "--inspect" || argument == "--interface" ||
               argument == "--output-binary") {
      if (i + 1 >= arguments_I.size()) {
        mError = argument + " needs a value";
        return false;
      }
      std::string& value = argument == "--inspect"     ? mInspectFile
                           : argument == "--interface" ? mInspectInterface
                                                       : mInspectOutputBinary;
      value = arguments_I[++i];
    } else if (argument == "--json") {
      mInspectJson = true;
    } else if (argument == "--list") {
      mList = true;
    } else if (argument == "--headless") {
      mHeadless = true;
    } else if (argument == "--yes") {
      mYes = true;
    } else if (argument == "--lab-fast") {
      mLabFast = true;
    } else if (argument == "--lab-fault" || argument == "--lab-state") {
      if (i + 1 >= arguments_I.size()) {
        mError = argument + " needs a value";
        return false;
      }
      if (argument == "--lab-fault") {
        mLabFaults.push_back(arguments_I[++i]);
      } else {
        mLabState = arguments_I[++i];
      }
    } else if (argument == "--lab") {
      mLab = true;
      // The product name is optional: what follows is taken unless it is an option.
      if (i + 1 < arguments_I.size() && !arguments_I[i + 1].empty() &&
          arguments_I[i + 1][0] != '-') {
        mLabName = arguments_I[++i];
      }
    } else if (argument.rfind("--", 0) == 0) {
      mError = "unknown option " + argument;
      return false;
    } else {
      mUpdaterArguments.push_back(argument);
    }
  }
  if (mInspectFile.empty() && (!mInspectInterface.empty() || !mInspectOutputBinary.empty())) {
    mError = "--interface and --output-binary go with --inspect";
    return false;
  }
  if (mInspectJson && mInspectFile.empty() && !mList) {
    mError = "--json goes with --inspect or --list";
    return false;
  }
  if (!mLab && (mLabFast || !mLabFaults.empty() || !mLabState.empty())) {
    mError = "--lab-fault, --lab-state and --lab-fast go with --lab";
    return false;
  }
  if (mList && !mInspectFile.empty()) {
    mError = "--list and --inspect do not go together";
    return false;
  }
  return true;
}

std::string CCommandLine::HelpText() {
  return std::string("Usage: ") + TAV_PROGRAM_NAME +
         " [options] [-p FILE] [-t FILE] [-b FILE] [-s FILE] [-f CONFIG]\n"
         "\n"
         "Updates the firmware of a pen tablet or pen display.\n"
         "\n"
         "Board arguments, one update each, in the given order:\n"
         "  -p VALUE      update the pen controller\n"
         "  -t VALUE      update the touch controller\n"
         "  -b VALUE      update the Bluetooth module\n"
         "  -s VALUE      update the display scalar\n"
         "  -f CONFIG     path of the device configuration (fw_loader.ini)\n"
         "\n"
         "Options:\n"
         "  -h, --help    show this text and exit\n"
         "      --version show the version and exit\n"
         "  -v, --verbose write log lines to standard error\n"
         "      --log FILE  append log lines to FILE\n"
         "\n"
         "Looking at a firmware file, without touching a device:\n"
         "      --inspect FILE        load FILE as an update would and show its content\n"
         "      --interface NAME      hid (default), bulk, i2c or ftdi; decides how .bin is read\n"
         "      --json                show the content as one JSON object\n"
         "      --output-binary PATH  write the loaded image to PATH as flat bytes\n"
         "\n"
         "Finding devices, without updating them:\n"
         "      --list                show each tablet or pen display found and its boards\n"
         "      --lab [NAME]          use the built-in emulated products instead of USB;\n"
         "                            NAME picks one (default wireless-tablet), \"list\" names\n"
         "                            them all\n"
         "      --lab-fault KIND@N    inject a fault into the lab (repeatable): vanish@N,\n"
         "                            fail-read@N, fail-write@N, stall@N, busy@N,\n"
         "                            refuse-switch, bad-crc@N\n"
         "      --lab-state DIR       where the lab keeps its boards between runs\n"
         "      --lab-fast            run the lab on a virtual clock: no real waiting\n"
         "      --headless            no window; exit status 0 updated, 1 failed, 2 no\n"
         "                            device, 3 firmware file refused, 4 not confirmed\n"
         "      --yes                 answer the confirmation with yes\n"
         "      --json                with --list, show the result as one JSON object\n";
}
