#include "common/CTavReaderWriterSemaphore.h"

#include "common/CLinuxReaderWriterSemaphore.h"

std::shared_ptr<CTavReaderWriterSemaphore> CTavReaderWriterSemaphore::New(const char* name_I) {
  return std::make_shared<CLinuxReaderWriterSemaphore>(name_I);
}
