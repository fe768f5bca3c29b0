// Faults of chunked bodies. Each makes the body a chunked one.
#include <fmt/format.h>

#include <cctype>

#include "tools/twcamsim/faults.h"

namespace {

// Several chunks, so that the fault is not in the last one alone.
void ManyChunks(Response* response, const FaultContext&) {
  response->chunked = true;
  response->more = nullptr;
  response->chunk_size = std::max<size_t>(1, (response->body.size() + 2) / 3);
}

void ChunksOf(Response* response, const FaultContext& context) {
  ManyChunks(response, context);
  response->chunk_size = static_cast<size_t>(context.Number(0));
}

FaultType Make(const char* name, const char* meaning, void (*hook)(Wire*, const FaultContext&)) {
  FaultHooks hooks;
  hooks.response = ManyChunks;
  hooks.wire = hook;
  return {name, "chunks", {}, meaning, hooks};
}

// The step at which the second chunk begins, or the first when there is no second.
WireStep* SecondSize(Wire* wire) {
  WireStep* found = nullptr;
  int count = 0;
  for (WireStep& step : *wire) {
    if (step.part == Part::kChunkSize && ++count <= 2) found = &step;
  }
  return found;
}

void SetSecondSize(Wire* wire, const std::string& size) {
  if (WireStep* step = SecondSize(wire)) step->bytes = size + "\r\n";
}

template <typename Change>
void ForEach(Wire* wire, Part part, Change change) {
  for (WireStep& step : *wire) {
    if (step.part == part) change(&step);
  }
}

// A challenge is not chunked, so there may be no last chunk.
void NoLast(Wire* wire, const FaultContext&) {
  const size_t last = FindPart(*wire, Part::kLastChunk);
  if (last < wire->size()) (*wire)[last] = {Action::kClose, Part::kLastChunk, "", {}};
}

void NoLineEnd(Wire* wire, const FaultContext&) {
  ForEach(wire, Part::kChunkEnd, [](WireStep* step) { step->bytes.clear(); });
}

void Extensions(Wire* wire, const FaultContext&) {
  ForEach(wire, Part::kChunkSize, [](WireStep* step) {
    step->bytes.insert(step->bytes.size() - 2, ";name=\"value; 7\";flag");
  });
}

void UpperCase(Wire* wire, const FaultContext&) {
  ForEach(wire, Part::kChunkSize, [](WireStep* step) {
    std::string size = "000";
    for (const char letter : step->bytes) size += static_cast<char>(std::toupper(letter));
    step->bytes = size;
  });
}

void Trailer(Wire* wire, const FaultContext&) {
  ForEach(wire, Part::kLastChunk,
          [](WireStep* step) { step->bytes = "0\r\nX-Checksum: 5f3d9c\r\n\r\n"; });
}

void AndLength(Wire* wire, const FaultContext&) {
  if (FindPart(*wire, Part::kLastChunk) < wire->size()) SetWireHeader(wire, "Content-Length", "7");
}

std::vector<FaultType> SizeFaults() {
  return {
      Make("chunk-bad-size", "a chunk's size is no number",
           [](Wire* wire, const FaultContext&) { SetSecondSize(wire, "zz"); }),
      Make("chunk-empty-size", "a chunk's size line is empty",
           [](Wire* wire, const FaultContext&) { SetSecondSize(wire, ""); }),
      Make("chunk-overflow", "a chunk's size does not fit in 64 bits",
           [](Wire* wire, const FaultContext&) { SetSecondSize(wire, "10000000000000005"); }),
      Make("chunk-negative", "a chunk's size is negative",
           [](Wire* wire, const FaultContext&) { SetSecondSize(wire, "-5"); }),
      Make("chunk-too-long", "a chunk announces more than the connection brings",
           [](Wire* wire, const FaultContext&) {
             SetSecondSize(wire, "fffff");
             wire->push_back({Action::kClose, Part::kLastChunk, "", {}});
           }),
      Make("chunk-upper-case", "the chunks' sizes are in upper case with leading zeros", UpperCase),
  };
}

}  // namespace

std::vector<FaultType> ChunkFaults() {
  std::vector<FaultType> types = SizeFaults();
  types.push_back(
      Make("chunk-no-line-end", "the line end behind the chunks is missing", NoLineEnd));
  types.push_back(Make("chunk-no-last", "the connection closes instead of the last chunk", NoLast));
  types.push_back(Make("chunk-extension", "the chunks' sizes have extensions", Extensions));
  types.push_back(Make("chunk-trailer", "a header follows the last chunk", Trailer));
  types.push_back(
      Make("chunk-and-length", "chunks, and a Content-Length that is wrong", AndLength));
  FaultHooks sizes;
  sizes.response = ChunksOf;
  types.push_back({"chunks",
                   "chunks",
                   {{"BYTES", "7", 1, 1 << 20}},
                   "the body comes in good chunks of so many bytes",
                   sizes});
  return types;
}
