#pragma once
// The seams a run works through: the Linux ones (libudev, hidraw, libusb,
// libftdi1, DRM), or the lab's, with one emulated product plugged into the
// lab bus. Only the application chooses between the two; everything above
// the seams is the same in both.

#include <memory>
#include <string>

#include "platform/linux/CLinuxDiscovery.h"
#include "seams/CDeviceRegistry.h"
#include "seams/CDisplays.h"
#include "seams/CFTDIExAPI32.h"

class CLabBus;

class CRunSeams {
 public:
  static std::unique_ptr<CRunSeams> MakeLinux();
  // The lab with product `product_I` (empty for the default one) as a
  // previous lab run left it; null, with a reason, for an unknown product.
  static std::unique_ptr<CRunSeams> MakeLab(const std::string& product_I, std::string& error_O);
  // The same, with the boards' state read from `stateFolder_I` (empty: the
  // default folder).
  static std::unique_ptr<CRunSeams> MakeLab(const std::string& product_I,
                                            const std::string& stateFolder_I, std::string& error_O);
  // The lab's bus; null in a Linux run.
  const std::shared_ptr<CLabBus>& GetLabBus() const { return mLabBus; }

  const std::shared_ptr<CDeviceRegistry>& GetRegistry() const { return mRegistry; }
  // The FTDI bridges and the attached displays of the scalar path.
  const std::shared_ptr<CFTDIExAPI32>& GetFTDI() const { return mFTDI; }
  const std::shared_ptr<CDisplays>& GetDisplays() const { return mDisplays; }
  std::unique_ptr<CLinuxDiscovery> MakeDiscovery() const;
  // The scalar path reaches the bridges and displays through process-wide
  // pointers; these seams must outlive every use after this call.
  void ShareScalarSeams() const;

 private:
  CRunSeams() = default;

  std::shared_ptr<CLabBus> mLabBus;
  std::shared_ptr<CDeviceRegistry> mRegistry;
  std::shared_ptr<CFTDIExAPI32> mFTDI;
  std::shared_ptr<CDisplays> mDisplays;
  CLinuxDiscovery::HidNodeFactory mMakeHidNode;
  CLinuxDiscovery::UsbControlFactory mMakeUsbControl;
};
