#include "common/CTavSemaphore.h"

#include "common/CLinuxSemaphore.h"

std::shared_ptr<CTavSemaphore> CTavSemaphore::New(const char* name_I) {
  return std::make_shared<CLinuxSemaphore>(name_I);
}
