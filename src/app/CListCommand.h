#pragma once
// --list [--lab [NAME]] [--json] [-f CONFIG]: runs discovery once and shows
// each product found with its boards: where each board was found, how it
// is reached, its version and the firmware file the configuration names
// for it. Nothing is sent to a device.
//
// Exit status: 0 with at least one product, 2 with none, 64 for a wrong
// lab product name.

#include <cstdint>
#include <cstdio>
#include <memory>
#include <string>
#include <vector>

#include "devices/CDeviceList.h"

class CCommandLine;
class CDeviceRegistry;
class CRunSeams;

class CListCommand {
 public:
  struct SBoardLine {
    std::string board;      // "pen", "touch", "bluetooth", "scalar"
    std::string path;       // empty when not found
    std::string interface;  // "HID", "BULK", "I2C", "FTDI", or "" for none configured
    std::string version;    // empty when unknown
    std::string firmware;
  };
  struct SProductLine {
    std::string name;
    uint32_t vendorId = 0;  // of its pen controller
    uint32_t productId = 0;
    bool loaderMode = false;
    std::vector<SBoardLine> boards;  // pen, touch, Bluetooth, scalar
  };

  explicit CListCommand(const CCommandLine& commandLine_I);

  int Run(std::FILE* out_IO, std::FILE* err_IO);
  // Lists what `seams_I` shows, with the configuration at `configPath_I`.
  int Run(const CRunSeams& seams_I, const std::string& configPath_I, std::FILE* out_IO,
          std::FILE* err_IO);

  // -f CONFIG, else fw_loader.ini beside the program, else the installed one.
  static std::string ConfigPath(const std::vector<std::string>& updaterArguments_I);
  static void PrintLabProducts(std::FILE* out_IO);
  // Each product `seams_I` shows, as the configuration at `configPath_I`
  // describes it; empty also when the configuration cannot be read.
  static std::vector<SProductLine> Find(const CRunSeams& seams_I, const std::string& configPath_I);

 private:
  static std::vector<SProductLine> Describe(const CDeviceList& list_I, CDeviceRegistry& registry_I);
  void PrintText(const std::vector<SProductLine>& products_I, std::FILE* out_IO) const;
  void PrintJson(const std::vector<SProductLine>& products_I, std::FILE* out_IO) const;

  std::string mConfigPath;
  bool mLab = false;
  std::string mLabName;
  std::string mLabState;  // as the last run left the boards; default when empty
  std::vector<std::string> mLabFaults;
  bool mJson = false;
  bool mConfigRead = false;
};
