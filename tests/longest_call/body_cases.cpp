// Reading a body that stops.
#include "tests/longest_call/cases.h"

namespace {

Case Stops(const char* name, const char* bound, double seconds, const std::string& faults,
           int result) {
  return {name, bound, seconds, Camera("json," + faults), Operation("get_body"), result};
}

}  // namespace

std::vector<Case> BodyCases() {
  return {
      Stops("ReadBody, silence", "T", 1, "fault=stall-after-head", HTTP_RET_IO_ERROR),
      Stops("ReadBody, silence after a part", "3 T", 3, "fault=stall-in-body:10",
            HTTP_RET_IO_ERROR),
      Stops("ReadBody, silence before a chunk's size", "7 T", 7,
            "fault=chunks:10,fault=stall-after-head", HTTP_RET_OK),
      Stops("ReadBody, silence in a chunk, fewer than 1,024 bytes missing", "8 T", 8,
            "fault=chunks:32,fault=stall-in-body:10", HTTP_RET_IO_ERROR),
      Stops("ReadBody, silence in a chunk, 1,024 bytes or more missing", "3 T", 3,
            "fault=big-body:2000,fault=chunks:1500,fault=stall-in-body:10", HTTP_RET_IO_ERROR),
      Stops("ReadBody, silence after a chunk", "14 T", 14, "fault=chunks:10,fault=stall-in-body:10",
            HTTP_RET_OK),
      // The head has 103 bytes; 14 of the body follow at once, and nothing for 20 seconds.
      Stops("ReadBody, silence after a chunk's carriage return", "8 T", 8,
            "fault=chunks:10,fault=slow:117:20000", HTTP_RET_OK),
  };
}
