// The examples of the manual pages do what the pages say.
#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <unistd.h>

#include "docs/man/examples/examples.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/ports.h"
#include "tests/support/scripted_peer.h"
#include "tests/support/tls_scripted_peer.h"

using ::testing::ElementsAre;
using ::testing::MatchesRegex;

TEST(ManLog, TheDaemonReportsItsCamera) {
  constexpr int kDebug2 = 6;
  const LogCapture log(kDebug2);
  ReportCamera(3, false);
  EXPECT_THAT(
      log.Lines("camera"),
      ElementsAre(IsLog("camera", "warn", "camerad", "ReportCamera", "camera 3 does not respond\n"),
                  IsLog("camera", "debug2", "camerad", "ReportCamera", "camera 3\n")));
}

TEST(ManLog, ANotificationGoesToTheOtherFile) {
  const LogCapture log;
  NotifyUser("disk full");
  EXPECT_EQ(log.Text(), "");
  EXPECT_THAT(
      ReadFile(kNotificationLog),
      MatchesRegex(
          ".* \\[[0-9]+\\]\\[notify\\]\\[notice\\] camerad:[0-9]+:NotifyUser\\(\\): disk full\n"));
  unlink(kNotificationLog);
}

TEST(ManText, TheResultsAreThoseOfThePage) {
  EXPECT_EQ(QueryOf(" Main Gate/2\t"), "place=Main%20Gate/2");
  EXPECT_EQ(BasicLogin("operator", "gate-7"), "b3BlcmF0b3I6Z2F0ZS03");
  EXPECT_EQ(SnapshotName(3, 1709647389417000), "3-20240305T140309.417Z.jpg");
}

TEST(ManThread, TheFramesAreGrabbedAndThePictureIsSent) {
  EXPECT_EQ(GrabThreeFrames(), 3);
  int ends[2];
  ASSERT_EQ(pipe(ends), 0);
  EXPECT_TRUE(SendPicture(ends[1], "picture"));
  char bytes[16];
  EXPECT_EQ(read(ends[0], bytes, sizeof(bytes)), 7);
  close(ends[0]);
  close(ends[1]);
}

TEST(ManSocket, ADeviceGreetsPlainAndOverTls) {
  const std::vector<Script> script = {{ExpectExactly("HELO\n"), Send("gate 2\r\n"), Close()}};
  ScriptedPeer plain(script);
  EXPECT_EQ(Greeting("127.0.0.1", plain.Port(), false), "gate 2");
  TlsScriptedPeer tls(script);
  EXPECT_EQ(Greeting("127.0.0.1", tls.Port(), true), "gate 2");
  const ClosedPort closed;
  EXPECT_EQ(Greeting("127.0.0.1", closed.Port(), false), "");
}

TEST(ManCurl, TheStatusIsTheServers) {
  ScriptedPeer peer({Exchange("HTTP/1.1 204 No Content\r\n\r\n")});
  EXPECT_EQ(StatusOf("http://127.0.0.1:" + std::to_string(peer.Port()) + "/"), 204);
  const ClosedPort closed;
  EXPECT_EQ(StatusOf("http://127.0.0.1:" + std::to_string(closed.Port()) + "/"), -1);
}

TEST(ManPlatform, TheSettingIsDoubled) {
  const TempDir directory;
  const std::string path = directory.File("settings.conf");
  WriteFile(path, "# rate\nrate=\"12\"\n");
  EXPECT_EQ(DoubleSetting(path.c_str(), "rate"), 0);
  EXPECT_EQ(ReadFile(path), "# rate\nrate=\"24\"\n");
  EXPECT_EQ(DoubleSetting(directory.File("none").c_str(), "rate"), -1);
}

TEST(ManScope, TheDevicesTextIsEscaped) {
  ScriptedPeer peer({Exchange("HTTP/1.1 200 OK\r\n\r\n<a>\n")});
  const LogCapture log(1);
  EXPECT_EQ(AskDevice("127.0.0.1", peer.Port()), -2);
  EXPECT_THAT(log.Lines("http"), ElementsAre(IsLog("http", "error", "twhttp", "SendHttpGet",
                                                   "Failed to parse json [<a>\\x0A].\n")));
}

TEST(ManVersion, TheLibraryIsTheOneOfTheBuild) {
  EXPECT_TRUE(LibraryIsNewEnough());
}
