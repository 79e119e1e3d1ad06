#pragma once
// A bridge library for what the lab bridge never does: one bridge whose
// reset fails `resetFailures` times, whose engine answers the bad-command
// probe with `probeAnswer`, an acknowledge bit for every byte clocked out
// (from `acks`, 0 once they run out) and a byte for every byte clocked in
// (from `reads`, `defaultRead` once they run out).

#include <cstdint>
#include <deque>
#include <vector>

#include "seams/CFTDIExAPI32.h"

class RecordingFTDIExAPI32 : public CFTDIExAPI32 {
 public:
  int resetFailures = 0;
  std::vector<uint8_t> probeAnswer{0xFA, 0xAA};
  std::deque<uint8_t> acks;
  std::deque<uint8_t> reads;
  uint8_t defaultRead = 0xFF;

  std::vector<uint8_t> sent;  // the bytes clocked out onto the bus, in order
  int resets = 0;
  bool open = false;

  FT_STATUS FT_ListDevices(void* arg1_IO, void* arg2_IO, uint32_t flags_I) override {
    if (flags_I == FT_LIST_NUMBER_ONLY) {
      *static_cast<uint32_t*>(arg1_IO) = 1;
    } else {
      *static_cast<uint32_t*>(arg2_IO) = 0x01200000;
    }
    return FT_OK;
  }
  FT_STATUS FT_OpenEx(void*, uint32_t, FT_HANDLE* handle_O) override {
    open = true;
    *handle_O = this;
    return FT_OK;
  }
  FT_STATUS FT_Close(FT_HANDLE) override {
    open = false;
    return FT_OK;
  }
  FT_STATUS FT_ResetDevice(FT_HANDLE) override {
    return ++resets <= resetFailures ? FT_IO_ERROR : FT_OK;
  }
  FT_STATUS FT_SetUSBParameters(FT_HANDLE, uint32_t, uint32_t) override { return FT_OK; }
  FT_STATUS FT_SetChars(FT_HANDLE, uint8_t, uint8_t, uint8_t, uint8_t) override { return FT_OK; }
  FT_STATUS FT_SetTimeouts(FT_HANDLE, uint32_t, uint32_t) override { return FT_OK; }
  FT_STATUS FT_SetLatencyTimer(FT_HANDLE, uint8_t) override { return FT_OK; }
  FT_STATUS FT_SetBitMode(FT_HANDLE, uint8_t, uint8_t) override { return FT_OK; }
  FT_STATUS FT_Purge(FT_HANDLE, uint32_t) override { return FT_OK; }

  FT_STATUS FT_Write(FT_HANDLE, const void* buffer_I, uint32_t size_I,
                     uint32_t* written_O) override {
    const auto* bytes = static_cast<const uint8_t*>(buffer_I);
    const std::vector<uint8_t> w(bytes, bytes + size_I);
    if (w == std::vector<uint8_t>{0xAA})
      mPending.insert(mPending.end(), probeAnswer.begin(), probeAnswer.end());
    if (w.size() > 3 && w[0] == 0x11) {  // a byte clocked out
      sent.push_back(w[3]);
      mPending.push_back(Next(acks, 0));
    } else if (w.size() > 3 && w[3] == 0x24) {  // a byte clocked in
      mPending.push_back(Next(reads, defaultRead));
    }
    *written_O = size_I;
    return FT_OK;
  }
  FT_STATUS FT_Read(FT_HANDLE, void* buffer_O, uint32_t size_I, uint32_t* read_O) override {
    uint32_t count = 0;
    for (; count < size_I && !mPending.empty(); ++count) {
      static_cast<uint8_t*>(buffer_O)[count] = mPending.front();
      mPending.pop_front();
    }
    *read_O = count;
    return FT_OK;
  }
  FT_STATUS FT_GetQueueStatus(FT_HANDLE, uint32_t* rxBytes_O) override {
    *rxBytes_O = static_cast<uint32_t>(mPending.size());
    return FT_OK;
  }

 private:
  static uint8_t Next(std::deque<uint8_t>& queue_IO, uint8_t default_I) {
    if (queue_IO.empty()) return default_I;
    const uint8_t value = queue_IO.front();
    queue_IO.pop_front();
    return value;
  }

  std::deque<uint8_t> mPending;
};
