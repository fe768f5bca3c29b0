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

FaultType Make(const char* name, const char* meaning, void (*hook)(Steps*, const FaultContext&)) {
  FaultHooks hooks;
  hooks.response = ManyChunks;
  hooks.steps = hook;
  return {name, "chunks", {}, meaning, hooks};
}

// The step at which the second chunk begins, or the first when there is no second.
Step* SecondSize(Steps* steps) {
  Step* found = nullptr;
  int count = 0;
  for (Step& step : *steps) {
    if (step.part == Part::kChunkSize && ++count <= 2) found = &step;
  }
  return found;
}

void SetSecondSize(Steps* steps, const std::string& size) {
  if (Step* step = SecondSize(steps)) step->bytes = size + "\r\n";
}

template <typename Change>
void ForEach(Steps* steps, Part part, Change change) {
  for (Step& step : *steps) {
    if (step.part == part) change(&step);
  }
}

// A challenge is not chunked, so there may be no last chunk.
void NoLast(Steps* steps, const FaultContext&) {
  const size_t last = FindPart(*steps, Part::kLastChunk);
  if (last < steps->size()) (*steps)[last] = {Action::kClose, Part::kLastChunk, "", {}};
}

void NoLineEnd(Steps* steps, const FaultContext&) {
  ForEach(steps, Part::kChunkEnd, [](Step* step) { step->bytes.clear(); });
}

void Extensions(Steps* steps, const FaultContext&) {
  ForEach(steps, Part::kChunkSize, [](Step* step) {
    step->bytes.insert(step->bytes.size() - 2, ";name=\"value; 7\";flag");
  });
}

void UpperCase(Steps* steps, const FaultContext&) {
  ForEach(steps, Part::kChunkSize, [](Step* step) {
    std::string size = "000";
    for (const char letter : step->bytes) size += static_cast<char>(std::toupper(letter));
    step->bytes = size;
  });
}

void Trailer(Steps* steps, const FaultContext&) {
  ForEach(steps, Part::kLastChunk,
          [](Step* step) { step->bytes = "0\r\nX-Checksum: 5f3d9c\r\n\r\n"; });
}

void AndLength(Steps* steps, const FaultContext&) {
  if (FindPart(*steps, Part::kLastChunk) < steps->size()) SetHeader(steps, "Content-Length", "7");
}

std::vector<FaultType> SizeFaults() {
  return {
      Make("chunk-bad-size", "a chunk's size is no number",
           [](Steps* steps, const FaultContext&) { SetSecondSize(steps, "zz"); }),
      Make("chunk-empty-size", "a chunk's size line is empty",
           [](Steps* steps, const FaultContext&) { SetSecondSize(steps, ""); }),
      Make("chunk-overflow", "a chunk's size does not fit in 64 bits",
           [](Steps* steps, const FaultContext&) { SetSecondSize(steps, "10000000000000005"); }),
      Make("chunk-negative", "a chunk's size is negative",
           [](Steps* steps, const FaultContext&) { SetSecondSize(steps, "-5"); }),
      Make("chunk-too-long", "a chunk announces more than the connection brings",
           [](Steps* steps, const FaultContext&) {
             SetSecondSize(steps, "fffff");
             steps->push_back({Action::kClose, Part::kLastChunk, "", {}});
           }),
      Make("chunk-upper-case", "the chunks' sizes are in upper case with leading zeros", UpperCase),
  };
}

}  // namespace

std::vector<FaultType> ChunkFaults() {
  std::vector<FaultType> types = SizeFaults();
  types.push_back(Make("chunk-no-line-end", "the CRLF after the chunks is missing", NoLineEnd));
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
