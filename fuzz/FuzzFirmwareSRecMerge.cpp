// Reads the input as a list of records, writes them as an S3 file and checks
// that loading it gives exactly what the plain walk over all blocks gives.
// Addresses fall in narrow windows across a few 2 MiB edges, so repeats and
// overlaps are common, records straddle the edges and a file can take more
// of the address line than the loader stages.
#include <cstddef>
#include <cstdint>
#include <string>
#include <vector>

#include "FuzzFirmwareFile.h"
#include "firmware/CSRec.h"
#include "firmware/FirmwareFiles.h"
#include "firmware/SRecReferenceMerge.h"

extern "C" int LLVMFuzzerTestOneInput(const uint8_t* data_I, size_t size_I) {
  static const CFuzzFile file(".tav");
  // Each record: two address bytes (bits 12-10 pick the edge, bits 9-0 the
  // place in the KiB around it), one size byte (0..63), then its data.
  static constexpr uint32_t kEdges[8] = {2u << 20, 2u << 20, 2u << 20, 2u << 20,
                                         512,      4u << 20, 6u << 20, 0xFFE00000u};
  std::vector<SContinuousDataBlock> records;
  size_t at = 0;
  while (at + 3 <= size_I) {
    SContinuousDataBlock record;
    const uint32_t word = uint32_t{data_I[at]} << 8 | data_I[at + 1];
    record.startAddress = kEdges[(word >> 10) & 7] - 512 + (word & 0x3FF);
    const size_t size = data_I[at + 2] & 0x3F;
    at += 3;
    for (size_t i = 0; i < size; ++i) record.data.push_back(at < size_I ? data_I[at++] : 0);
    records.push_back(record);
  }
  if (records.empty()) return 0;
  std::string text;
  for (const SContinuousDataBlock& record : records) {
    text += SRecLine('3', record.startAddress, record.data) + "\n";
  }
  const SReferenceMergeResult expected = ReferenceMerge(records);
  CSRec source;
  const bool loaded = source.Load(file.Write(text), EHID_INTERFACE);
  Require(loaded == (expected.overlapPair == 0));
  Require(source.GetSRecDataRef() == expected.blocks);
  return 0;
}
