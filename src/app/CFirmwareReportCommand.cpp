#include "app/CFirmwareReportCommand.h"

#include <fcntl.h>
#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <charconv>
#include <cstdio>
#include <cstring>
#include <memory>
#include <thread>
#include <vector>

#include "app/CCommandLine.h"
#include "app/JsonString.h"
#include "app/TavVersion.h"
#include "common/StringUtilities.h"
#include "common/TavAssert.h"
#include "common/TavLog.h"
#include "firmware/CBinaryAiroFlash.h"
#include "firmware/CIntelHex.h"
#include "firmware/CSRec.h"
#include "firmware/CScalarBinary.h"
#include "firmware/CScalarRTDISP.h"
#include "firmware/FirmwareFileCheck.h"
#include "update/CApplicationDelegate.h"

namespace {

struct SFormatText {
  EDataSourceFormat format;
  const char* name;
  const char* description;
};
constexpr SFormatText kFormatTexts[] = {
    {EDS_SREC_PEN, "EDS_SREC_PEN", "S-record, pen controller"},
    {EDS_SREC_TOUCH, "EDS_SREC_TOUCH", "S-record, touch controller"},
    {EDS_SREC_GENERIC, "EDS_SREC_GENERIC", "S-record"},
    {EDS_INTEL_HEX, "EDS_INTEL_HEX", "Intel hex"},
    {EDS_AIROFLASH, "EDS_AIROFLASH", "Bluetooth module binary"},
    {EDS_AIROFLASH2, "EDS_AIROFLASH2", "Bluetooth module binary, second kind"},
    {EDS_SCALAR_RTDISP, "EDS_SCALAR_RTDISP", "display scalar binary for the bridge link"},
    {EDS_SCALAR_BINARY, "EDS_SCALAR_BINARY", "display scalar binary for HID"},
};

const SFormatText& TextOf(EDataSourceFormat format_I) {
  static constexpr SFormatText kUnknown{EDS_UNKNOWN, "EDS_UNKNOWN", "unknown"};
  for (const SFormatText& text : kFormatTexts) {
    if (text.format == format_I) return text;
  }
  return kUnknown;
}

bool IsSRecord(EDataSourceFormat format_I) {
  return format_I == EDS_SREC_PEN || format_I == EDS_SREC_TOUCH || format_I == EDS_SREC_GENERIC;
}

// A listing can hold a line for each of a few hundred thousand blocks: the
// lines are built by hand into one text rather than printed one by one.
void AppendNumber(std::string& text_IO, uint64_t value_I) {
  char digits[24];
  const auto end = std::to_chars(digits, digits + sizeof digits, value_I).ptr;
  text_IO.append(digits, end);
}

void AppendHex8(std::string& text_IO, uint32_t value_I) {
  static constexpr char kDigits[] = "0123456789ABCDEF";
  for (int shift = 28; shift >= 0; shift -= 4) text_IO += kDigits[(value_I >> shift) & 0x0F];
}

// How many blocks ahead a walk over blocks asks for their data.
constexpr size_t kAhead = 48;

uint64_t ByteSum(const std::vector<uint8_t>& data_I) {
  uint64_t sum = 0;
  for (uint8_t byte : data_I) sum += byte;
  return sum;
}

std::vector<uint64_t> ByteSums(const std::vector<SContinuousDataBlock>& blocks_I) {
  std::vector<uint64_t> sums(blocks_I.size());
  for (size_t i = 0; i < blocks_I.size(); ++i) {
    if (i + kAhead < blocks_I.size()) __builtin_prefetch(blocks_I[i + kAhead].data.data());
    sums[i] = ByteSum(blocks_I[i].data);
  }
  return sums;
}

// Freeing the many blocks of a large image costs more than the rest of the
// ending: the last source loaded is kept, reachable, until the process ends.
void KeepUntilExit(std::unique_ptr<CSRec> source_I) {
  static CSRec* sKept = nullptr;
  delete sKept;
  sKept = source_I.release();
}

// The reader's own words: its first error line, or, where it only raised an
// assertion, the assertion's text.
class CReasonListener {
 public:
  CReasonListener() {
    mLogHandle = TavLog::AddOutput([this](const std::string& text_I) {
      static const std::string kErrorTag = "[E] ";
      if (mError.empty() && text_I.compare(0, kErrorTag.size(), kErrorTag) == 0) {
        mError = StringUtilities::Trim_Copy(text_I.substr(kErrorTag.size()));
      }
    });
    mAssertHandle = TavAssert::AddObserver([this](const std::string& line_I) {
      static const std::string kMarker = "failed assertion: ";
      const size_t at = line_I.find(kMarker);
      if (mAssertion.empty() && at != std::string::npos) {
        mAssertion = line_I.substr(at + kMarker.size());
        if (mAssertion.size() >= 2 && mAssertion.front() == '"' && mAssertion.back() == '"') {
          mAssertion = mAssertion.substr(1, mAssertion.size() - 2);
        }
      }
    });
  }
  ~CReasonListener() {
    TavLog::RemoveOutput(mLogHandle);
    TavAssert::RemoveObserver(mAssertHandle);
  }
  CReasonListener(const CReasonListener&) = delete;
  CReasonListener& operator=(const CReasonListener&) = delete;

  std::string Reason() const {
    if (!mError.empty()) return mError;
    if (!mAssertion.empty()) return mAssertion;
    return "the file did not load";
  }

 private:
  int mLogHandle = 0;
  int mAssertHandle = 0;
  std::string mError;
  std::string mAssertion;
};

// Writes the image beside its path and puts it in place only once whole. The
// pieces are handed to the system many at a time straight from where they
// lie: an image of small blocks would otherwise cost a call or a copy each.
class CImageWriter {
 public:
  explicit CImageWriter(const std::string& path_I)
      : mPath(path_I),
        mTemporary(path_I + ".tmp" + std::to_string(getpid())),
        mFd(open(mTemporary.c_str(), O_WRONLY | O_CREAT | O_TRUNC | O_CLOEXEC, 0666)) {
    if (mFd < 0) Fail();
    mPieces.reserve(kMostPieces);
  }
  ~CImageWriter() {
    if (mFd >= 0) close(mFd);
    if (mFd >= 0 || mFailed) std::remove(mTemporary.c_str());
  }
  CImageWriter(const CImageWriter&) = delete;
  CImageWriter& operator=(const CImageWriter&) = delete;

  // The bytes must stay where they are until Close.
  void Write(const uint8_t* data_I, size_t size_I) {
    if (mFd < 0 || mFailed || size_I == 0) return;
    mPieces.push_back({const_cast<uint8_t*>(data_I), size_I});
    if (mPieces.size() == kMostPieces) Flush();
  }
  void Fill(uint64_t size_I) {
    static const std::vector<uint8_t> kErased(size_t{1} << 16, 0xFF);
    while (size_I > 0 && mFd >= 0 && !mFailed) {
      const size_t now = static_cast<size_t>(std::min<uint64_t>(size_I, kErased.size()));
      Write(kErased.data(), now);
      size_I -= now;
    }
  }
  bool Close(std::string& reason_O) {
    if (mFd >= 0) {
      Flush();
      if (!mFailed && fsync(mFd) != 0) Fail();
      if (close(mFd) != 0) Fail();
      mFd = -1;
    }
    if (!mFailed && std::rename(mTemporary.c_str(), mPath.c_str()) != 0) Fail();
    if (!mFailed) return true;
    reason_O = "cannot write " + mPath + ": " + std::strerror(mError);
    return false;
  }

 private:
  static constexpr size_t kMostPieces = IOV_MAX;

  // A short write goes on from where it stopped.
  void Flush() {
    iovec* piece = mPieces.data();
    size_t left = mPieces.size();
    while (left > 0 && !mFailed) {
      const ssize_t done = writev(mFd, piece, static_cast<int>(left));
      if (done < 0 && errno == EINTR) continue;
      if (done <= 0) {
        if (done == 0) errno = EIO;
        Fail();
        break;
      }
      size_t taken = static_cast<size_t>(done);
      mWritten += taken;
      while (left > 0 && taken >= piece->iov_len) {
        taken -= piece->iov_len;
        ++piece;
        --left;
      }
      if (taken > 0) {
        piece->iov_base = static_cast<uint8_t*>(piece->iov_base) + taken;
        piece->iov_len -= taken;
      }
    }
    mPieces.clear();
    StartWriteBack();
  }

  // The disk starts on what is written while the rest is still being
  // written, so that the closing fsync has only the end left to wait for.
  // Only a hint: the fsync reports what goes wrong.
  void StartWriteBack() {
    static constexpr uint64_t kStep = uint64_t{4} << 20;
    if (mFailed || mWritten - mWrittenBack < kStep) return;
    sync_file_range(mFd, static_cast<off_t>(mWrittenBack),
                    static_cast<off_t>(mWritten - mWrittenBack), SYNC_FILE_RANGE_WRITE);
    mWrittenBack = mWritten;
  }

  void Fail() {
    if (!mFailed) mError = errno;
    mFailed = true;
  }

  std::string mPath;
  std::string mTemporary;
  int mFd;
  std::vector<iovec> mPieces;
  bool mFailed = false;
  int mError = 0;
  uint64_t mWritten = 0;
  uint64_t mWrittenBack = 0;
};

}  // namespace

CFirmwareReportCommand::CFirmwareReportCommand(const CCommandLine& commandLine_I)
    : mFile(commandLine_I.GetInspectFile()),
      mInterfaceName(commandLine_I.GetInspectInterface()),
      mJson(commandLine_I.GetInspectJson()),
      mOutputBinary(commandLine_I.GetInspectOutputBinary()) {}

bool CFirmwareReportCommand::ParseInterface(const std::string& name_I,
                                            EINTERFACE_TYPE& interface_O) {
  const std::string name = StringUtilities::ToLower_Copy(name_I);
  if (name == "hid")
    interface_O = EHID_INTERFACE;
  else if (name == "bulk")
    interface_O = EBULK_INTERFACE;
  else if (name == "i2c")
    interface_O = EI2C_INTERFACE;
  else if (name == "ftdi")
    interface_O = EFTDI_INTERFACE;
  else
    return false;
  return true;
}

int CFirmwareReportCommand::Run(std::FILE* out_IO, std::FILE* err_IO) {
  if (!mInterfaceName.empty() && !ParseInterface(mInterfaceName, mInterface)) {
    std::fprintf(err_IO, "%s: unknown interface %s: use hid, bulk, i2c or ftdi\n", TAV_PROGRAM_NAME,
                 mInterfaceName.c_str());
    return ERUN_USAGE;
  }
  auto kept = std::make_unique<CSRec>();
  CSRec& source = *kept;
  KeepUntilExit(std::move(kept));
  std::string reason;
  // A FIFO would block the reader and an oversized binary be read whole:
  // such a file is refused before it is opened.
  const std::string problem = FirmwareFileCheck::Problem(mFile, mInterface);
  if (FirmwareFileCheck::KeepsReaderAway(mFile, mInterface) || !Load(source, reason)) {
    if (!problem.empty()) reason = problem;
    if (mJson) {
      std::fprintf(out_IO, "{\"file\":%s,\"error\":%s}\n", JsonString(mFile).c_str(),
                   JsonString(reason).c_str());
    } else {
      std::fprintf(err_IO, "%s: %s: %s\n", TAV_PROGRAM_NAME, mFile.c_str(), reason.c_str());
    }
    return 1;
  }
  // The blocks' sums are taken while the image is written, where each block
  // is read anyway; the listing comes after.
  std::vector<uint64_t> sums;
  const auto print = [&] {
    if (IsSRecord(source.GetDataSourceFormat()) && sums.empty()) {
      sums = ByteSums(source.GetSRecDataRef());
    }
    if (mJson) {
      PrintJson(source, sums, out_IO);
    } else {
      PrintText(source, sums, out_IO);
    }
  };
  bool written = true;
  if (mOutputBinary.empty()) {
    print();
  } else {
    written = WriteImage(source, sums, print, reason);
  }
  if (!written) {
    std::fprintf(err_IO, "%s: %s\n", TAV_PROGRAM_NAME, reason.c_str());
    return 1;
  }
  return 0;
}

// A listener makes the log format every line, and an S-record file logs each
// of its lines: a file is loaded unobserved, and only a failed load is read
// once more with a listener to learn why. A file of no known format is not
// read at all, so it is observed at once, and its assertion is raised once.
bool CFirmwareReportCommand::Load(CSRec& source_IO, std::string& reason_O) const {
  if (CSRec::FormatFor(mFile, mInterface) != EDS_UNKNOWN && source_IO.Load(mFile, mInterface)) {
    return true;
  }
  CReasonListener listener;
  if (source_IO.Load(mFile, mInterface)) return true;  // the file changed in between
  reason_O = listener.Reason();
  return false;
}

void CFirmwareReportCommand::PrintText(const CSRec& source_I, const std::vector<uint64_t>& sums_I,
                                       std::FILE* out_IO) const {
  const EDataSourceFormat format = source_I.GetDataSourceFormat();
  std::fprintf(out_IO, "File: %s\n", mFile.c_str());
  std::fprintf(out_IO, "Format: %s (%s)\n", TextOf(format).name, TextOf(format).description);
  if (IsSRecord(format)) {
    const std::vector<SContinuousDataBlock>& blocks = source_I.GetSRecDataRef();
    // The lines go out a piece at a time, not as one text the size of the
    // listing.
    static constexpr size_t kPiece = size_t{1} << 16;
    uint64_t total = 0;
    std::string text = "Blocks: ";
    text.reserve(kPiece + 64);
    AppendNumber(text, blocks.size());
    text += '\n';
    for (size_t i = 0; i < blocks.size(); ++i) {
      const SContinuousDataBlock& block = blocks[i];
      text += "  start 0x";
      AppendHex8(text, block.startAddress);
      text += "  size ";
      AppendNumber(text, block.data.size());
      text += "  sum ";
      AppendNumber(text, sums_I[i]);
      text += '\n';
      total += block.data.size();
      if (text.size() >= kPiece) {
        std::fwrite(text.data(), 1, text.size(), out_IO);
        text.clear();
      }
    }
    text += "Bytes: ";
    AppendNumber(text, total);
    text += '\n';
    std::fwrite(text.data(), 1, text.size(), out_IO);
  } else if (format == EDS_INTEL_HEX) {
    const CIntelHex& hex = *source_I.GetIntelHexData();
    std::fprintf(out_IO, "Start address: 0x%08X\nSize: %u\nChecksum: 0x%04X\n", hex.StartAddress(),
                 hex.Size(), hex.Checksum());
  } else if (format == EDS_AIROFLASH || format == EDS_AIROFLASH2) {
    std::fprintf(out_IO, "Size: %u\n", source_I.GetBinaryAiroFlashData()->Size());
  } else if (format == EDS_SCALAR_RTDISP) {
    std::fprintf(out_IO, "Size: %u\n", source_I.GetScalarRtdIspData()->Size());
  } else if (format == EDS_SCALAR_BINARY) {
    const CScalarBinary& binary = *source_I.GetScalarBinaryData();
    std::fprintf(out_IO, "Size: %u\nBlocks: %lu\n", binary.Size(), binary.NumBlocks());
  }
}

void CFirmwareReportCommand::PrintJson(const CSRec& source_I, const std::vector<uint64_t>& sums_I,
                                       std::FILE* out_IO) const {
  const EDataSourceFormat format = source_I.GetDataSourceFormat();
  std::string json = "{\"file\":" + JsonString(mFile) + ",\"format\":\"" + TextOf(format).name +
                     "\",\"formatValue\":" + std::to_string(format) +
                     ",\"description\":" + JsonString(TextOf(format).description);
  if (IsSRecord(format)) {
    uint64_t total = 0;
    json += ",\"blocks\":[";
    bool first = true;
    const std::vector<SContinuousDataBlock>& blocks = source_I.GetSRecDataRef();
    for (size_t i = 0; i < blocks.size(); ++i) {
      const SContinuousDataBlock& block = blocks[i];
      json += first ? "{\"start\":" : ",{\"start\":";
      AppendNumber(json, block.startAddress);
      json += ",\"size\":";
      AppendNumber(json, block.data.size());
      json += ",\"sum\":";
      AppendNumber(json, sums_I[i]);
      json += '}';
      total += block.data.size();
      first = false;
    }
    json += "],\"size\":" + std::to_string(total);
  } else if (format == EDS_INTEL_HEX) {
    const CIntelHex& hex = *source_I.GetIntelHexData();
    json += ",\"startAddress\":" + std::to_string(hex.StartAddress()) +
            ",\"size\":" + std::to_string(hex.Size()) +
            ",\"checksum\":" + std::to_string(hex.Checksum());
  } else if (format == EDS_AIROFLASH || format == EDS_AIROFLASH2) {
    json += ",\"size\":" + std::to_string(source_I.GetBinaryAiroFlashData()->Size());
  } else if (format == EDS_SCALAR_RTDISP) {
    json += ",\"size\":" + std::to_string(source_I.GetScalarRtdIspData()->Size());
  } else if (format == EDS_SCALAR_BINARY) {
    const CScalarBinary& binary = *source_I.GetScalarBinaryData();
    json += ",\"size\":" + std::to_string(binary.Size()) +
            ",\"blockCount\":" + std::to_string(binary.NumBlocks());
  }
  json += "}\n";
  std::fputs(json.c_str(), out_IO);
}

// S-record blocks are laid out from the lowest start with gaps erased to
// 0xFF, and their sums taken on the way; the other formats are written as
// their reader holds them.
bool CFirmwareReportCommand::WriteImage(const CSRec& source_I, std::vector<uint64_t>& sums_O,
                                        const std::function<void()>& whileClosing_I,
                                        std::string& reason_O) const {
  // The writer takes the bytes where they lie, until it is closed.
  std::vector<uint8_t> rtdIspImage;
  CImageWriter writer(mOutputBinary);
  const EDataSourceFormat format = source_I.GetDataSourceFormat();
  if (IsSRecord(format)) {
    const std::vector<SContinuousDataBlock>& blocks = source_I.GetSRecDataRef();
    uint64_t next = blocks.empty() ? 0 : blocks.front().startAddress;
    sums_O.resize(blocks.size());
    for (size_t i = 0; i < blocks.size(); ++i) {
      const SContinuousDataBlock& block = blocks[i];
      // Small blocks lie all over the heap; ask for one well ahead.
      if (i + kAhead < blocks.size()) __builtin_prefetch(blocks[i + kAhead].data.data());
      sums_O[i] = ByteSum(block.data);
      if (block.startAddress > next) writer.Fill(block.startAddress - next);
      writer.Write(block.data.data(), block.data.size());
      next = uint64_t{block.startAddress} + block.data.size();
    }
  } else if (format == EDS_INTEL_HEX) {
    const CIntelHex& hex = *source_I.GetIntelHexData();
    writer.Write(hex.GetData(), hex.Size());
  } else if (format == EDS_AIROFLASH || format == EDS_AIROFLASH2) {
    const CBinaryAiroFlash& binary = *source_I.GetBinaryAiroFlashData();
    writer.Write(binary.GetData(), binary.Size());
  } else if (format == EDS_SCALAR_RTDISP) {
    rtdIspImage = source_I.GetScalarRtdIspData()->GetData();
    writer.Write(rtdIspImage.data(), rtdIspImage.size());
  } else if (format == EDS_SCALAR_BINARY) {
    // The blocks hold the image; the last one is padded past the size.
    const CScalarBinary& binary = *source_I.GetScalarBinaryData();
    uint64_t left = binary.Size();
    for (unsigned long i = 0; i < binary.NumBlocks() && left > 0; ++i) {
      const size_t now =
          static_cast<size_t>(std::min<uint64_t>(left, CScalarBinary::kBlockDataSize));
      writer.Write(binary.BlockPtr(i)->data, now);
      left -= now;
    }
  }
  // The disk takes its time over the last of the image: the listing is
  // printed meanwhile.
  bool closed = false;
  std::thread closing([&] { closed = writer.Close(reason_O); });
  try {
    whileClosing_I();
  } catch (...) {
    closing.join();
    throw;
  }
  closing.join();
  return closed;
}
