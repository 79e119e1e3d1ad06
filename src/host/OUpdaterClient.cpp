#include "host/OUpdaterClient.h"

#include <mutex>

namespace {
std::mutex gFactoryLock;
OUpdaterClient::Factory gFactory;
}  // namespace

std::shared_ptr<OUpdaterClient> OUpdaterClient::client() {
  std::lock_guard<std::mutex> guard(gFactoryLock);
  return gFactory ? gFactory() : nullptr;
}

void OUpdaterClient::SetFactory(Factory factory_I) {
  std::lock_guard<std::mutex> guard(gFactoryLock);
  gFactory = std::move(factory_I);
}
