#pragma once
// A bridge library for the link's tests: one bridge, every FT_Write kept,
// and just enough of an answer for the link to go on. It answers the
// bad-command probe, an acknowledge bit for every byte sent (from `acks`,
// 0 once they run out) and a byte for every byte clocked in (from `reads`,
// `defaultRead` once they run out). It knows the primitives only by their
// exact byte strings, so Trace() shows any other string as "?".

#include <cstdint>
#include <deque>
#include <string>
#include <vector>

#include "common/StringUtilities.h"
#include "seams/CFTDIExAPI32.h"

class RecordingFTDIExAPI32 : public CFTDIExAPI32 {
 public:
  static inline const std::vector<uint8_t> kStart = {
      0x80, 3, 3, 0x80, 3, 3, 0x80, 3, 3, 0x80, 3, 3, 0x80, 1, 3, 0x80, 1, 3,
      0x80, 1, 3, 0x80, 1, 3, 0x80, 0, 3, 0x80, 0, 3, 0x80, 0, 3, 0x80, 0, 3};
  static inline const std::vector<uint8_t> kStop = {0x80, 1, 3, 0x80, 1, 3, 0x80, 1, 3,
                                                    0x80, 1, 3, 0x80, 3, 3, 0x80, 3, 3,
                                                    0x80, 3, 3, 0x80, 3, 3, 0x80, 2, 3};
  static inline const std::vector<uint8_t> kReleaseSDA = {0x80, 0x02, 0x03};
  static std::vector<uint8_t> SendByteString(uint8_t byte_I) {
    return {0x11, 0, 0, byte_I, 0x80, 0, 1, 0x22, 0, 0x87, 0x80, 0, 3};
  }
  static std::vector<uint8_t> GetByteString(bool ack_I) {
    return {0x80, 0, 1, 0x24, 0, 0, 0x80, 0, 3, 0x13, 0, static_cast<uint8_t>(ack_I ? 0 : 0x80)};
  }

  uint32_t bridges = 1;
  FT_STATUS openStatus = FT_OK;
  int resetFailures = 0;
  std::deque<uint8_t> acks;
  std::deque<uint8_t> reads;
  uint8_t defaultRead = 0xFF;
  // FT_Write fails with FT_IO_ERROR at this call number (0 first).
  size_t failWrite = SIZE_MAX;
  // What the engine answers to the bad-command probe.
  std::vector<uint8_t> probeAnswer{0xFA, 0xAA};
  // Bytes the bridge holds before anything is written.
  std::deque<uint8_t> pending;

  std::vector<std::vector<uint8_t>> writes;
  int resets = 0;
  bool open = false;

  FT_STATUS FT_ListDevices(void* arg1_IO, void* arg2_IO, uint32_t flags_I) override {
    if (flags_I == FT_LIST_NUMBER_ONLY) {
      *static_cast<uint32_t*>(arg1_IO) = bridges;
      return FT_OK;
    }
    if (reinterpret_cast<uintptr_t>(arg1_IO) >= bridges) return FT_DEVICE_NOT_FOUND;
    *static_cast<uint32_t*>(arg2_IO) =
        0x01200000 + static_cast<uint32_t>(reinterpret_cast<uintptr_t>(arg1_IO));
    return FT_OK;
  }
  FT_STATUS FT_OpenEx(void*, uint32_t, FT_HANDLE* handle_O) override {
    if (openStatus != FT_OK) return openStatus;
    open = true;
    *handle_O = this;
    return FT_OK;
  }
  FT_STATUS FT_Close(FT_HANDLE) override {
    open = false;
    return FT_OK;
  }
  FT_STATUS FT_ResetDevice(FT_HANDLE) override {
    ++resets;
    return resets <= resetFailures ? FT_IO_ERROR : FT_OK;
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
    const size_t call = writes.size();
    writes.emplace_back(bytes, bytes + size_I);
    if (call == failWrite) return FT_IO_ERROR;
    const std::vector<uint8_t>& written = writes.back();
    if (written == std::vector<uint8_t>{0xAA})
      pending.insert(pending.end(), probeAnswer.begin(), probeAnswer.end());
    if (written.size() == 13 && written == SendByteString(written[3]))
      pending.push_back(Next(acks, 0));
    if (written == GetByteString(true) || written == GetByteString(false)) {
      pending.push_back(Next(reads, defaultRead));
    }
    *written_O = size_I;
    return FT_OK;
  }
  FT_STATUS FT_Read(FT_HANDLE, void* buffer_O, uint32_t size_I, uint32_t* read_O) override {
    uint32_t count = 0;
    for (; count < size_I && !pending.empty(); ++count) {
      static_cast<uint8_t*>(buffer_O)[count] = pending.front();
      pending.pop_front();
    }
    *read_O = count;
    return FT_OK;
  }
  FT_STATUS FT_GetQueueStatus(FT_HANDLE, uint32_t* rxBytes_O) override {
    *rxBytes_O = static_cast<uint32_t>(pending.size());
    return FT_OK;
  }

  // The bus traffic of the writes from `first_I` on: "S" start, "P" stop,
  // two hexadecimal digits a byte sent, "R" and "R-" a byte read with and
  // without acknowledge, "B" the bad-command probe, "?" anything else. The
  // direction reset after every byte is left out.
  std::string Trace(size_t first_I = 0) const {
    std::string trace;
    for (size_t i = first_I; i < writes.size(); ++i) {
      const std::vector<uint8_t>& w = writes[i];
      std::string word;
      if (w == kStart)
        word = "S";
      else if (w == kStop)
        word = "P";
      else if (w == kReleaseSDA)
        continue;
      else if (w.size() == 13 && w == SendByteString(w[3]))
        word = StringUtilities::Format("%02X", w[3]);
      else if (w == GetByteString(true))
        word = "R";
      else if (w == GetByteString(false))
        word = "R-";
      else if (w == std::vector<uint8_t>{0xAA})
        word = "B";
      else
        word = "?";
      if (!trace.empty()) trace += ' ';
      trace += word;
    }
    return trace;
  }

 private:
  static uint8_t Next(std::deque<uint8_t>& queue_IO, uint8_t default_I) {
    if (queue_IO.empty()) return default_I;
    const uint8_t value = queue_IO.front();
    queue_IO.pop_front();
    return value;
  }
};
