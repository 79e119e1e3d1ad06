#include "app/CListCommand.h"

#include <sys/stat.h>

#include <algorithm>

#include "app/CCommandLine.h"
#include "app/CRunSeams.h"
#include "app/JsonString.h"
#include "app/TavVersion.h"
#include "common/LinuxPaths.h"
#include "devices/IOUtils.h"
#include "flash/CFLDeviceInterface.h"
#include "lab/CLabBus.h"
#include "lab/CLabOptions.h"
#include "lab/CLabProducts.h"
#include "scalar/DisplayUtils.h"
#include "scalar/ScalarProbe.h"
#include "scalar/SensorFamilies.h"
#include "update/CApplicationDelegate.h"

namespace {

constexpr const char* kConfigFileName = "fw_loader.ini";

bool FileExists(const std::string& path_I) {
  struct stat info {};
  return stat(path_I.c_str(), &info) == 0 && S_ISREG(info.st_mode);
}

const char* InterfaceWord(EINTERFACE_TYPE type_I) {
  switch (type_I) {
    case EHID_INTERFACE: return "HID";
    case EBULK_INTERFACE: return "BULK";
    case EI2C_INTERFACE: return "I2C";
    case EFTDI_INTERFACE: return "FTDI";
    default: return "";
  }
}

}  // namespace

CListCommand::CListCommand(const CCommandLine& commandLine_I)
    : mConfigPath(ConfigPath(commandLine_I.GetUpdaterArguments())),
      mLab(commandLine_I.GetLab()),
      mLabName(commandLine_I.GetLabName()),
      mLabState(commandLine_I.GetLabState()),
      mLabFaults(commandLine_I.GetLabFaults()),
      mJson(commandLine_I.GetInspectJson()) {}

std::string CListCommand::ConfigPath(const std::vector<std::string>& updaterArguments_I) {
  for (size_t i = 0; i + 1 < updaterArguments_I.size(); ++i) {
    if (updaterArguments_I[i] == "-f") return updaterArguments_I[i + 1];
  }
  const std::string beside =
      LinuxPaths::AppendPathComponent(LinuxPaths::GetExecutableFolderPath(), kConfigFileName);
  if (FileExists(beside)) return beside;
  return LinuxPaths::AppendPathComponent(LinuxPaths::GetInstalledDataFolderPath(), kConfigFileName);
}

void CListCommand::PrintLabProducts(std::FILE* out_IO) {
  for (const SLabProduct& product : CLabProducts::All()) {
    std::fprintf(out_IO, "%-22s %s%s\n", product.name.c_str(), product.summary.c_str(),
                 product.name == CLabProducts::DefaultName() ? " (the default)" : "");
  }
}

int CListCommand::Run(std::FILE* out_IO, std::FILE* err_IO) {
  if (mLab && mLabName == "list") {
    PrintLabProducts(out_IO);
    return 0;
  }
  std::string error;
  std::unique_ptr<CRunSeams> seams =
      mLab ? CRunSeams::MakeLab(mLabName, mLabState, error) : CRunSeams::MakeLinux();
  if (!seams) {
    std::fprintf(err_IO, "%s: %s\n", TAV_PROGRAM_NAME, error.c_str());
    return ERUN_USAGE;
  }
  // Faults show what the listing makes of a board that misbehaves.
  CLabOptions faults;
  for (const std::string& fault : mLabFaults) {
    if (!faults.AddFault(fault, error)) {
      std::fprintf(err_IO, "%s: --lab-fault %s: %s\n", TAV_PROGRAM_NAME, fault.c_str(),
                   error.c_str());
      return ERUN_USAGE;
    }
  }
  if (seams->GetLabBus()) seams->GetLabBus()->AddFaults(faults.GetFaults(), faults.GetSeed());
  return Run(*seams, mConfigPath, out_IO, err_IO);
}

int CListCommand::Run(const CRunSeams& seams_I, const std::string& configPath_I, std::FILE* out_IO,
                      std::FILE* err_IO) {
  mConfigPath = configPath_I;
  seams_I.ShareScalarSeams();
  std::unique_ptr<CLinuxDiscovery> discovery = seams_I.MakeDiscovery();
  discovery->SetConfig(mConfigPath);
  discovery->GenerateDeviceList();
  mConfigRead = discovery->GetSupportedDeviceInfo().WasRead();
  const std::vector<SProductLine> products =
      Describe(discovery->GetDeviceList(), *seams_I.GetRegistry());

  if (!mConfigRead) {
    std::fprintf(err_IO, "The device configuration %s could not be read, so no product is known.\n",
                 mConfigPath.c_str());
  }
  if (mJson) {
    PrintJson(products, out_IO);
  } else {
    PrintText(products, out_IO);
  }
  return products.empty() ? 2 : 0;
}

std::vector<CListCommand::SProductLine> CListCommand::Find(const CRunSeams& seams_I,
                                                           const std::string& configPath_I) {
  seams_I.ShareScalarSeams();
  std::unique_ptr<CLinuxDiscovery> discovery = seams_I.MakeDiscovery();
  discovery->SetConfig(configPath_I);
  discovery->GenerateDeviceList();
  return Describe(discovery->GetDeviceList(), *seams_I.GetRegistry());
}

std::vector<CListCommand::SProductLine> CListCommand::Describe(const CDeviceList& list_I,
                                                               CDeviceRegistry& registry_I) {
  const auto boardLine = [&](const char* board_I, const CDevice::InterfacePtr& interface_I,
                             EINTERFACE_TYPE configured_I, const std::string& firmware_I) {
    SBoardLine line;
    line.board = board_I;
    line.firmware = firmware_I;
    line.interface = InterfaceWord(interface_I ? interface_I->GetInterfaceType() : configured_I);
    if (interface_I) {
      line.path = interface_I->GetPath();
      line.version = IOUtils::FindReleaseText(registry_I, line.path);
    }
    return line;
  };
  // A scalar behind a display's bridge has no interface of its own: it is
  // the family's display of the scalar's product id whose scalar answers with
  // that display's serial number, and the `-s` value is its path.
  const auto bridgedScalar = [](const CDevice& device_I, SBoardLine& line_IO) {
    for (const auto& display :
         DisplayUtils::TavikDisplayAttributesWithPID(device_I.GetScalarProductId())) {
      const SScalarProbe probe = ProbeScalar(
          display->StringForKeyWithDefault(DisplayUtils::kAlphanumericSerialNumberKey, ""),
          ScalarSensorId(device_I.GetPenProductId()));
      if (probe.found) {
        line_IO.path = DisplayUtils::ScalarArgument(*display);
        line_IO.version = probe.version;
        return;
      }
    }
  };

  std::vector<SProductLine> products;
  std::vector<CDevice::InterfacePtr> pensListed;
  for (size_t i = 0; i < list_I.GetDeviceCount(); ++i) {
    const std::shared_ptr<CDevice> device = list_I.GetDevice(i);
    // Discovery keeps a second entry for a pen in its loader, holding the
    // same interface; it is one product to the user.
    const CDevice::InterfacePtr pen = device->GetPenInterface();
    if (pen && std::find(pensListed.begin(), pensListed.end(), pen) != pensListed.end()) continue;
    if (pen) pensListed.push_back(pen);
    SProductLine product;
    product.name = device->GetDeviceName();
    product.vendorId = device->GetPenVendorId();
    product.productId = device->GetPenProductId();
    product.loaderMode = device->GetIsFlashLoader();
    product.boards.push_back(boardLine("pen", device->GetPenInterface(),
                                       device->GetPenInterfaceType(), device->GetPenUpdate()));
    if (device->GetTouchSupported()) {
      product.boards.push_back(boardLine("touch", device->GetTouchInterface(),
                                         device->GetTouchInterfaceType(),
                                         device->GetTouchUpdate()));
    }
    if (device->GetBluetoothSupported()) {
      product.boards.push_back(boardLine("bluetooth", device->GetBluetoothInterface(),
                                         device->GetBluetoothInterfaceType(),
                                         device->GetBluetoothUpdate()));
    }
    if (device->GetScalarSupported()) {
      product.boards.push_back(boardLine("scalar", device->GetScalarInterface(),
                                         device->GetScalarInterfaceType(),
                                         device->GetScalarUpdate()));
      if (device->GetScalarInterfaceType() == EFTDI_INTERFACE) {
        bridgedScalar(*device, product.boards.back());
      }
    }
    products.push_back(product);
  }
  return products;
}

void CListCommand::PrintText(const std::vector<SProductLine>& products_I, std::FILE* out_IO) const {
  if (products_I.empty()) {
    std::fprintf(out_IO, "No supported tablet or pen display was found.\n");
    return;
  }
  std::fprintf(out_IO, "%zu %s found (configuration %s):\n", products_I.size(),
               products_I.size() == 1 ? "product" : "products", mConfigPath.c_str());
  for (const SProductLine& product : products_I) {
    std::fprintf(out_IO, "\n%s, %s\n", product.name.c_str(),
                 product.loaderMode ? "in loader mode" : "in normal mode");
    std::fprintf(out_IO, "  %-10s %-5s %-34s %-8s %s\n", "board", "via", "interface path",
                 "version", "firmware file");
    for (const SBoardLine& board : product.boards) {
      const std::string where = board.path.empty() ? "not found" : board.path;
      std::fprintf(out_IO, "  %-10s %-5s %-34s %-8s %s\n", board.board.c_str(),
                   board.interface.c_str(), where.c_str(),
                   board.version.empty() ? "-" : board.version.c_str(),
                   board.firmware.empty() ? "none named" : board.firmware.c_str());
    }
  }
}

void CListCommand::PrintJson(const std::vector<SProductLine>& products_I, std::FILE* out_IO) const {
  std::string json = "{\"configuration\":" + JsonString(mConfigPath) +
                     ",\"configurationRead\":" + (mConfigRead ? "true" : "false") +
                     ",\"products\":[";
  for (size_t i = 0; i < products_I.size(); ++i) {
    const SProductLine& product = products_I[i];
    json += std::string(i ? "," : "") + "{\"name\":" + JsonString(product.name) +
            ",\"loaderMode\":" + (product.loaderMode ? "true" : "false") + ",\"boards\":[";
    for (size_t j = 0; j < product.boards.size(); ++j) {
      const SBoardLine& board = product.boards[j];
      json += std::string(j ? "," : "") + "{\"board\":" + JsonString(board.board) +
              ",\"found\":" + (board.path.empty() ? "false" : "true") +
              ",\"interface\":" + JsonString(board.interface) +
              ",\"path\":" + (board.path.empty() ? "null" : JsonString(board.path)) +
              ",\"version\":" + (board.version.empty() ? "null" : JsonString(board.version)) +
              ",\"firmware\":" + JsonString(board.firmware) + "}";
    }
    json += "]}";
  }
  json += "]}\n";
  std::fputs(json.c_str(), out_IO);
}
