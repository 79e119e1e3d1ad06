// The lab's FTDI bridge, driven through the bridge seam with raw MPSSE
// byte strings, for what the link never sends: commands the engine does not
// know, malformed bus sequences and the violations they leave, the reset
// and a request with a wrong sum, each board variant's write-protect
// sequence by hand, the nak fault, and the lab displays. The link's own
// traffic over the lab, page programming and the state folder are checked
// in the scalar tests.

#include <gtest/gtest.h>

#include <numeric>

#include "lab/CLabDisplays.h"
#include "lab/CLabFTDIBridge.h"
#include "lab/CLabFTDIExAPI32.h"
#include "lab/CLabProducts.h"
#include "lab/LabCrc.h"
#include "support/LabFixture.h"

namespace {

using Bytes = std::vector<uint8_t>;

class LabFTDI : public LabFixture {
 protected:
  void Plug(const std::string& product_I) {
    CLabProducts::Plug(*mBus, product_I);
    mBridge = std::dynamic_pointer_cast<CLabFTDIBridge>(mBus->FindBoard(product_I + "-scalar"));
    ASSERT_NE(mBridge, nullptr);
    mApi = std::make_unique<CLabFTDIExAPI32>(mBus);
  }

  // Opens the first bridge in MPSSE mode with the link's pins: SDA
  // open-drain, both lines high. The read time-out stays the driver's.
  void Open() {
    const uint32_t location = mApi->Locations().at(0);
    ASSERT_EQ(mApi->FT_OpenEx(reinterpret_cast<void*>(uintptr_t{location}), FT_OPEN_BY_LOCATION,
                              &mHandle),
              FT_OK);
    ASSERT_EQ(mApi->FT_SetBitMode(mHandle, 0, FT_BITMODE_MPSSE), FT_OK);
    Send({0x9E, 0x02, 0x00, 0x80, 0x03, 0x03});
  }

  uint32_t Waiting() {
    uint32_t waiting = 0;
    EXPECT_EQ(mApi->FT_GetQueueStatus(mHandle, &waiting), FT_OK);
    return waiting;
  }
  void Send(const Bytes& bytes_I) {
    uint32_t written = 0;
    ASSERT_EQ(
        mApi->FT_Write(mHandle, bytes_I.data(), static_cast<uint32_t>(bytes_I.size()), &written),
        FT_OK);
  }
  Bytes Take(size_t count_I) {
    Bytes bytes(count_I);
    uint32_t read = 0;
    EXPECT_EQ(mApi->FT_Read(mHandle, bytes.data(), static_cast<uint32_t>(count_I), &read), FT_OK);
    bytes.resize(read);
    return bytes;
  }

  // The bus primitives, byte for byte as the host's link sends them.
  void Start() {
    Bytes bytes;
    for (uint8_t value : {0x03, 0x01, 0x00}) {
      for (int i = 0; i < 4; ++i) bytes.insert(bytes.end(), {0x80, value, 0x03});
    }
    Send(bytes);
  }
  void Stop() {
    Bytes bytes;
    for (uint8_t value : {0x01, 0x03}) {
      for (int i = 0; i < 4; ++i) bytes.insert(bytes.end(), {0x80, value, 0x03});
    }
    bytes.insert(bytes.end(), {0x80, 0x02, 0x03});
    Send(bytes);
  }
  bool SendByte(uint8_t byte_I) {
    Send({0x11, 0x00, 0x00, byte_I, 0x80, 0x00, 0x01, 0x22, 0x00, 0x87, 0x80, 0x00, 0x03});
    Send({0x80, 0x02, 0x03});
    const Bytes ack = Take(1);
    return ack.size() == 1 && (ack[0] & 1) == 0;
  }
  uint8_t GetByte(bool ack_I) {
    Send({0x80, 0x00, 0x01, 0x24, 0x00, 0x00, 0x80, 0x00, 0x03, 0x13, 0x00,
          static_cast<uint8_t>(ack_I ? 0x00 : 0x80)});
    const Bytes byte = Take(1);
    return byte.empty() ? 0 : byte[0];
  }

  // A DDC/CI request and its reply as read from 0x6F, checksum included.
  Bytes Exchange(const Bytes& frame_I) {
    Start();
    for (uint8_t byte : frame_I) EXPECT_TRUE(SendByte(byte));
    Stop();
    Start();
    EXPECT_TRUE(SendByte(0x6F));
    Bytes reply{GetByte(true), GetByte(true)};
    for (int i = 0; i <= (reply[1] & 0x7F); ++i) reply.push_back(GetByte(true));
    Stop();
    return reply;
  }

  void WriteReg(uint8_t register_I, uint8_t value_I) {
    Start();
    for (uint8_t byte : {uint8_t{0x94}, register_I, value_I}) SendByte(byte);
    Stop();
  }
  uint8_t ReadReg(uint8_t register_I) {
    Start();
    SendByte(0x94);
    SendByte(register_I);
    Start();
    SendByte(0x95);
    const uint8_t value = GetByte(false);
    Stop();
    return value;
  }
  bool WaitBit(uint8_t register_I, uint8_t mask_I, uint8_t target_I, int tries_I = 20) {
    for (int i = 0; i < tries_I; ++i) {
      if (((ReadReg(register_I) ^ target_I) & mask_I) == 0) return true;
    }
    return false;
  }
  // A flash instruction through 0x60/0x61, the bytes after the opcode from 0x64.
  void Instruction(uint8_t control_I, uint8_t opcode_I, const Bytes& out_I) {
    for (size_t i = 0; i < out_I.size(); ++i) WriteReg(static_cast<uint8_t>(0x64 + i), out_I[i]);
    WriteReg(0x60, control_I);
    WriteReg(0x61, opcode_I);
    WriteReg(0x60, control_I | 1);
    EXPECT_TRUE(WaitBit(0x60, 0x01, 0x00));
  }
  void WriteStatus(uint8_t value_I) { Instruction(0x68, 0x01, {value_I}); }
  void EraseBlock(uint8_t block_I) { Instruction(0xB8, 0xD8, {block_I, 0, 0}); }
  uint8_t Crc(uint32_t address_I, uint32_t length_I) {
    const uint32_t end = address_I + length_I - 1;
    for (uint8_t r : {0x64, 0x65, 0x66})
      WriteReg(r, static_cast<uint8_t>(address_I >> (8 * (0x66 - r))));
    for (uint8_t r : {0x72, 0x73, 0x74}) WriteReg(r, static_cast<uint8_t>(end >> (8 * (0x74 - r))));
    WriteReg(0x6F, ReadReg(0x6F) | 0x04);
    EXPECT_TRUE(WaitBit(0x6F, 0x04, 0x00));
    return ReadReg(0x75);
  }
  std::shared_ptr<CLabFTDIBridge> mBridge;
  std::unique_ptr<CLabFTDIExAPI32> mApi;
  FT_HANDLE mHandle = nullptr;
};

TEST_F(LabFTDI, TheEngineAnswersCommandsAsTheBridgeDoes) {
  Plug("display-ftdi");
  Open();
  const struct {
    Bytes command;
    Bytes answer;
  } rows[] = {
      {{0x8A, 0x97, 0x8D, 0xAB, 0x87}, {0xFA, 0xAB}},
      // Loopback with SCL an input, so no clock reaches the bus: data in
      // reads the data out pin.
      {{0x84, 0x80, 0x02, 0x02, 0x22, 0x02, 0x24, 0x01, 0x00}, {0x07, 0xFF, 0xFF}},
      {{0x80, 0x00, 0x00, 0x22, 0x00, 0x85}, {0x00}},
  };
  for (const auto& row : rows) {
    Send(row.command);
    EXPECT_EQ(Take(Waiting()), row.answer);
  }
  // A command split over transfers waits for its last byte.
  Send({0x86, 0x2B});
  Send({0x01});
  EXPECT_EQ(mBridge->GetEngine().GetDivisor(), 0x12B);
}

TEST_F(LabFTDI, TheSeamListsOpensAndRefusesAsTheDriverDoes) {
  Plug("display-ftdi");
  uint32_t location = 0;
  EXPECT_EQ(mApi->FT_ListDevices(reinterpret_cast<void*>(1), &location,
                                 FT_LIST_BY_INDEX | FT_OPEN_BY_LOCATION),
            FT_DEVICE_NOT_FOUND);
  ASSERT_EQ(mApi->FT_ListDevices(nullptr, &location, FT_LIST_BY_INDEX | FT_OPEN_BY_LOCATION),
            FT_OK);
  EXPECT_EQ(location, 0x01150000u) << "root port 1, hub port 5";
  Open();
  FT_HANDLE second = nullptr;
  EXPECT_EQ(
      mApi->FT_OpenEx(reinterpret_cast<void*>(uintptr_t{0x01250000}), FT_OPEN_BY_LOCATION, &second),
      FT_DEVICE_NOT_FOUND);
  EXPECT_EQ(mApi->FT_Purge(&second, 3), FT_INVALID_HANDLE);
  EXPECT_EQ(mApi->FT_SetUSBParameters(mHandle, 65536, 100), FT_INVALID_PARAMETER);

  // A short read returns what there is once the read time-out, the
  // driver's 300 ms here, has passed.
  Send({0xAA});
  const double before = mClock->Now();
  EXPECT_EQ(Take(3), (Bytes{0xFA, 0xAA}));
  EXPECT_DOUBLE_EQ(mClock->Now() - before, 0.3);
  Send({0xAA});
  ASSERT_EQ(mApi->FT_Purge(mHandle, FT_PURGE_RX | FT_PURGE_TX), FT_OK);
  EXPECT_EQ(Take(2), Bytes{});
  EXPECT_EQ(mApi->FT_Close(mHandle), FT_OK);
  EXPECT_EQ(mApi->FT_Close(mHandle), FT_INVALID_HANDLE);
}

TEST_F(LabFTDI, TheBusRecordsMalformedSequences) {
  Plug("display-ftdi");
  Open();
  const struct {
    const char* what;
    std::function<void()> run;
    const char* violation;
  } rows[] = {
      {"a byte cut short",
       [&] {
         Start();
         Send({0x13, 0x03, 0xD0});
         Stop();
       },
       "STOP after 4 bits of a byte"},
      {"SDA rising while an acknowledge is clocked",
       [&] {
         Start();
         Send({0x11, 0x00, 0x00, 0x50, 0x80, 0x00, 0x01, 0x80, 0x01, 0x03, 0x80, 0x03, 0x03});
       },
       "STOP during an acknowledge"},
      {"a read of nobody",
       [&] {
         Start();
         SendByte(0x51);
         GetByte(false);
         Stop();
       },
       "a read with no device addressed"},
      {"a clock with no START",
       [&] {
         Send({0x80, 0x03, 0x03, 0x80, 0x02, 0x03});
       },
       "a clock pulse outside any transaction"},
      {"a read on after a refused byte",
       [&] {
         Start();
         SendByte(0x95);
         GetByte(false);
         GetByte(false);
         Stop();
       },
       "a read clocked on after the host refused a byte"},
      {"SDA driven high, not let go, as the address is acknowledged",
       [&] {
         Send({0x9E, 0x00, 0x00});  // SDA push-pull
         Start();
         Send({0x11, 0x00, 0x00, 0x6F});
       },
       "the bridge drove SDA high while a device held it low"},
  };
  for (const auto& row : rows) {
    mBridge->ClearViolations();
    row.run();
    EXPECT_EQ(mBridge->GetViolations(),
              std::vector<std::string>{std::string("display-ftdi-scalar: ") + row.violation})
        << row.what;
  }
}

TEST_F(LabFTDI, TheScalarRestartsOnAResetAndIgnoresARequestWithAWrongSum) {
  Plug("display-ftdi");
  Open();
  // The reset request restarts the scalar, which is deaf while it boots.
  Start();
  for (uint8_t byte : {0xEE, 0x05, 0x11, 0x00, 0x00, 0xEA}) EXPECT_TRUE(SendByte(byte));
  Stop();
  Start();
  EXPECT_FALSE(SendByte(0x6F));
  Stop();
  EXPECT_EQ(mBridge->GetScalar().GetResets(), 1u);
  mClock->Advance(CLabDdcScalar::kBootSeconds);

  // A request with a wrong checksum is ignored and recorded.
  EXPECT_EQ(Exchange({0x6E, 0x51, 0x82, 0x01, 0xC9, 0x00}), (Bytes{0x6E, 0x80, 0xBE}));
  EXPECT_EQ(mBridge->GetViolations(),
            std::vector<std::string>{"display-ftdi-scalar: a request with a wrong checksum"});
}

TEST_F(LabFTDI, DisplaysCarryTheScalarsIdentityInARealEdid) {
  Plug("display-ftdi");
  CLabDisplays displays(mBus);
  for (const SDisplay& other : CLabProducts::OtherDisplays("display-hid")) displays.Add(other);
  const std::vector<SDisplay> list = displays.List();
  ASSERT_EQ(list.size(), 2u);
  const Bytes& edid = list[0].edid;
  ASSERT_EQ(edid.size(), 128u);
  EXPECT_EQ(Bytes(edid.begin(), edid.begin() + 12),
            (Bytes{0x00, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0xFF, 0x00, 0x5B, 0x27, 0x60, 0x10}));
  EXPECT_EQ(std::accumulate(edid.begin(), edid.end(), 0u) % 256, 0u);
  const Bytes serial{0x00, 0x00, 0xFF, 0x00, 'L', 'A', 'B', 'F', 'T', '0', '7', '0', '1', 0x0A};
  EXPECT_NE(std::search(edid.begin(), edid.end(), serial.begin(), serial.end()), edid.end());
  const Bytes name{0x00, 0x00, 0xFC, 0x00, 'L', 'a', 'b', ' ',
                   'D',  'i',  's',  'p',  'l', 'a', 'y', 0x0A};
  EXPECT_NE(std::search(edid.begin(), edid.end(), name.begin(), name.end()), edid.end());
  EXPECT_TRUE(list[1].edid.empty());
  EXPECT_EQ(list[1].manufacturerId, 0x5B27);
  EXPECT_EQ(list[1].productId, 0x0631);
  EXPECT_FALSE(list[1].serialNumber.empty());
}

// The write-protect sequences of the three board variants: register and
// value, kReadF5 reads 0xF5, kSetPin writes 0xF5 = (that AND 0xF8) + 1.
constexpr int kReadF5 = -1;
constexpr int kSetPin = -2;
using Sequence = std::vector<std::pair<uint8_t, int>>;
const Sequence kPlainSequence{{0xF4, 0x9F}, {0xF5, 0x10},    {0xF4, 0x38}, {0xF5, kReadF5},
                              {0xF4, 0x38}, {0xF5, kSetPin}, {0xF4, 0x9F}, {0xF5, 0xFE},
                              {0xF4, 0x28}, {0xF5, 1}};
const Sequence kQuantaSequence{{0xF4, 0x9F}, {0xF5, 0x10},    {0xF4, 0x36}, {0xF5, kReadF5},
                               {0xF4, 0x36}, {0xF5, kSetPin}, {0xF4, 0x9F}, {0xF5, 0xFE},
                               {0xF4, 0x26}, {0xF5, 1}};
const Sequence kVenusSequence{{0xF4, 0x95}, {0xF5, 0x10}, {0xF4, 0xD4}, {0xF5, 1}, {0xCD, 0},
                              {0xF4, 0x95}, {0xF5, 0x10}, {0xF4, 0xD8}, {0xF5, 1}, {0xA0, 1},
                              {0xF4, 0x95}, {0xF5, 0x10}, {0xF4, 0xEE}, {0xF5, 1}, {0xD7, 1}};

class LabFTDIVariant : public LabFTDI {
 protected:
  void Run(const Sequence& sequence_I) {
    uint8_t read = 0;
    for (const auto& [reg, value] : sequence_I) {
      if (value == kReadF5) {
        read = ReadReg(reg);
      } else {
        WriteReg(reg, value == kSetPin ? static_cast<uint8_t>((read & 0xF8) + 1)
                                       : static_cast<uint8_t>(value));
      }
    }
  }
  void EnterIsp() {
    WriteReg(0x6F, 0x80);
    ASSERT_TRUE(WaitBit(0x6F, 0x80, 0x80));
  }
};

TEST_F(LabFTDIVariant, OnlyEachBoardsOwnSequenceOpensItsFlash) {
  const char* products[] = {"display-ftdi", "display-ftdi-quanta", "display-ftdi-venus"};
  const Sequence* sequences[] = {&kPlainSequence, &kQuantaSequence, &kVenusSequence};
  for (size_t p = 0; p < 3; ++p) {
    for (size_t s = 0; s < 3; ++s) {
      SCOPED_TRACE(std::string(products[p]) + " with sequence " + std::to_string(s));
      mBus = CLabBus::Create();
      Plug(products[p]);
      Open();
      const Bytes factory = mBridge->GetFlash().GetData();
      EnterIsp();
      Run(*sequences[s]);
      WriteStatus(0x00);
      EraseBlock(0);
      const bool opened = p == s;
      EXPECT_EQ(Crc(0, 65536), opened ? 0xDE : LabCrc::ScalarBlock(factory.data(), 65536));
      EXPECT_EQ(mBridge->GetViolations().size(), opened ? 0u : 2u)
          << "the status write and the erase are refused";
      EXPECT_EQ(mBridge->GetFlash().GetData() == factory, !opened);
    }
  }
}

// The other scalar faults are met through the link, in UpdateScalar's
// tests; a nak fault the link only ever meets as a retry.
TEST_F(LabFTDI, ANakRefusesOneByteAndTheRestOfItsTransaction) {
  Plug("display-ftdi");
  Open();
  mBus->AddFaults({SLabFault{ELabFaultKind::eNak, 2, ""}}, 1);
  Start();
  EXPECT_TRUE(SendByte(0x6E));
  EXPECT_FALSE(SendByte(0x51));
  EXPECT_FALSE(SendByte(0x82)) << "the rest of the transaction goes unheard";
  Stop();
  Start();
  EXPECT_TRUE(SendByte(0x6E));
  Stop();
}

}  // namespace
