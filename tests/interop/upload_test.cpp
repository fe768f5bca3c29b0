// Streamed uploads into servers that hand the body to a program while it arrives.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cstdint>
#include <cstdlib>
#include <fstream>

#include "tests/interop/servers.h"

namespace {

constexpr char kBoundary[] = "-----------QUENMULTIPART_BOUNDARY-----------";
constexpr char kLenient[] = "lighttpd (header-strict off)";
constexpr int kPiece = 1 << 20;

// The most memory that the process has held since ResetPeak, in KiB.
long PeakMemory() {
  std::ifstream status("/proc/self/status");
  for (std::string line; std::getline(status, line);) {
    if (line.rfind("VmHWM:", 0) == 0) return std::atol(line.c_str() + 6);
  }
  ADD_FAILURE() << "no VmHWM";
  return 0;
}

void ResetPeak() {
  WriteFile("/proc/self/clear_refs", "5");
}

// Writes a part of `bytes` zero bytes and the closing boundary. Results: the bytes of all of it, or
// -1 when a write failed.
int64_t WriteUpload(TWHttpClient* client, int64_t bytes) {
  const std::string head =
      "--" + std::string(kBoundary) + "\r\nContent-Disposition: form-data; name=\"clip\"\r\n\r\n";
  const std::string end = "\r\n--" + std::string(kBoundary) + "--\r\n";
  const std::string piece(kPiece, '\0');
  const int head_size = static_cast<int>(head.size());
  const int end_size = static_cast<int>(end.size());
  if (client->WriteData(head.data(), head_size) != head_size) return -1;
  for (int64_t left = bytes; left > 0;) {
    const int size = static_cast<int>(std::min<int64_t>(left, kPiece));
    if (client->WriteData(piece.data(), size) != size) return -1;
    left -= size;
  }
  if (client->WriteData(end.data(), end_size) != end_size) return -1;
  return head_size + bytes + end_size;
}

// Removes what earlier uploads have left.
void ForgetCounts(const WebServer& server) {
  for (const char* name : {"count", "count.first"}) remove(server.File(name).c_str());
}

// What the server's program has counted.
std::string Counted(const WebServer& server) {
  const std::string file = server.File("count");
  WaitUntilTrue(
      "the program has counted", [&file] { return FileExists(file); }, 30);
  return ReadFile(file);
}

class UploadTest : public ::testing::TestWithParam<Mode> {};

INSTANTIATE_TEST_SUITE_P(, UploadTest, ::testing::ValuesIn(kModes),
                         [](const auto& test) { return NameOf(test.param); });

TEST_P(UploadTest, IsAnsweredAfterTheClosingBoundary) {
  Worked("OpenRawDataUpload with GetResp", kLenient, "none", GetParam());
  ClientSettings settings = LoginTo(GetParam(), "cgi/count.cgi");
  settings.timeout = 2;
  auto client = NewClient(Lighttpd(), settings);
  ForgetCounts(Lighttpd());
  ASSERT_EQ(client->OpenRawDataUpload(), HTTP_RET_OK);
  const int64_t sent = WriteUpload(client.get(), 5000000);
  const std::string count = std::to_string(sent) + " closed\n";
  EXPECT_EQ(client->GetResp(), count);
  EXPECT_EQ(Counted(Lighttpd()), count);
}

TEST_P(UploadTest, EndsWhereTheClientGoesAway) {
  Worked("OpenRawDataUpload, broken off", kLenient, "none", GetParam());
  auto client = NewClient(Lighttpd(), LoginTo(GetParam(), "cgi/count.cgi"));
  ForgetCounts(Lighttpd());
  ASSERT_EQ(client->OpenRawDataUpload(), HTTP_RET_OK);
  const std::string first = Lighttpd().File("count.first");
  ASSERT_EQ(client->WriteData("0123456789", 10), 10);
  WaitUntilTrue("the program reads", [&first] { return FileExists(first); });
  client.reset();
  EXPECT_EQ(Counted(Lighttpd()), "10 cut\n");
}

TEST(Upload, OfOneGibibyteNeedsNoMemory) {
  AddRow({"OpenRawDataUpload (1 GiB)", kLenient, "none", "plain", "buffered", "passed"});
  constexpr int64_t kGibibyte = int64_t{1} << 30;
  auto client = NewClient(Lighttpd(), LoginTo(kModes[0], "cgi/count.cgi"));
  ResetPeak();
  const long before = PeakMemory();
  ForgetCounts(Lighttpd());
  ASSERT_EQ(client->OpenRawDataUpload(), HTTP_RET_OK);
  const int64_t sent = WriteUpload(client.get(), kGibibyte);
  EXPECT_GT(sent, kGibibyte);
  EXPECT_EQ(Counted(Lighttpd()), std::to_string(sent) + " closed\n");
  EXPECT_LT(PeakMemory() - before, 8 * 1024);
}

TEST(Upload, IsRefusedByAStrictServer) {
  AddRow({"OpenRawDataUpload", "Apache httpd", "none", "plain", "buffered",
          "not possible: the server refuses a header name with a blank before its colon (400)"});
  ExposedClient client(Apache().Port(), LoginTo(kModes[0], "cgi/count.cgi"));
  ASSERT_EQ(client.OpenRawDataUpload(), HTTP_RET_OK);
  EXPECT_EQ(client.GetResp(), "{\"error\":true}");
  EXPECT_EQ(StatusOf(&client), 400);
}

}  // namespace
