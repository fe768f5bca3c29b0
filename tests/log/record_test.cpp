// The shared record: its layout, and how the library attaches it.
#include <gtest/gtest.h>
#include <sys/shm.h>
#include <unistd.h>

#include <cstdlib>
#include <cstring>
#include <string>
#include <vector>

#include "tarnwick/log/twdebuglog.h"
#include "tests/support/faults.h"
#include "tests/support/files.h"
#include "tests/support/log_capture.h"
#include "tests/support/process.h"

namespace {

class Record : public ::testing::Test {
 protected:
  Record() {
    FreeDbgCfg();
    RemoveSharedRecord();
    unlink(kMainLog);
  }
  ~Record() override { FreeDbgCfg(); }
};

std::vector<uint8_t> BytesOf(const TWDbgLogCfg& record) {
  std::vector<uint8_t> bytes(sizeof(record));
  memcpy(bytes.data(), &record, sizeof(record));
  return bytes;
}

int32_t WordAt(const std::vector<uint8_t>& bytes, size_t offset) {
  int32_t word;
  memcpy(&word, bytes.data() + offset, sizeof(word));
  return word;
}

TEST_F(Record, WithoutASegmentThePointerIsNullAndDetachingDoesNothing) {
  std::string output;
  EXPECT_EQ(RunProgram({TARNWICK_LOAD_PROBE, TARNWICK_LIBRARY, "1"}, &output).code, 0);
  EXPECT_EQ(output, "record null, +0 +0\n");
  InitDbgCfg();
  EXPECT_EQ(g_pDbgLogCfg, nullptr);
  Faults faults;
  FreeDbgCfg();
  EXPECT_EQ(faults.Count(Call::kShmdt), 0);
  EXPECT_EQ(g_pDbgLogCfg, nullptr);
}

TEST_F(Record, LoadingTheLibraryAttachesItAndUnloadingDetachesItEachTime) {
  const SharedRecord record;
  std::string output;
  EXPECT_EQ(RunProgram({TARNWICK_LOAD_PROBE, TARNWICK_LIBRARY, "3"}, &output).code, 0);
  EXPECT_EQ(output,
            "record attached, +1 +0\n"
            "record attached, +1 +0\n"
            "record attached, +1 +0\n");
  EXPECT_EQ(record.Attachments(), 0);
}

// The names take about 5,000 bytes. What other libraries keep differs by hundreds.
TEST_F(Record, UnloadingTheLibraryFreesTheNames) {
  std::string with_names;
  std::string without;
  EXPECT_EQ(RunProgram({TARNWICK_LOAD_PROBE, TARNWICK_LIBRARY, "20", "names"}, &with_names).code,
            0);
  EXPECT_EQ(RunProgram({TARNWICK_LOAD_PROBE, TARNWICK_LIBRARY, "20", "none"}, &without).code, 0);
  EXPECT_LT(atol(with_names.c_str()) - atol(without.c_str()), 20000);
}

// Other threads may still log then.
TEST_F(Record, AtTheEndOfTheProcessTheNamesStay) {
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
  GTEST_SKIP() << "the sanitizer's allocator does not tell the heap";
#endif
  std::string with_names;
  std::string without;
  EXPECT_EQ(RunProgram({TARNWICK_EXIT_PROBE, "names"}, &with_names).code, 0);
  EXPECT_EQ(RunProgram({TARNWICK_EXIT_PROBE, "none"}, &without).code, 0);
  EXPECT_GT(atol(with_names.c_str()) - atol(without.c_str()), 1500);  // half of them with 32 bits
}

TEST_F(Record, ARecordThatComesLaterIsNotSeenWithoutACall) {
  InitDbgCfg();
  const SharedRecord record;
  EXPECT_EQ(g_pDbgLogCfg, nullptr);
  EXPECT_FALSE(TWLogEnabled(LOG_CATEG_HTTP, LOG_LEVEL_INFO));
  EXPECT_EQ(record.Attachments(), 0);
}

TEST_F(Record, TheKeyIsTheProductsOwn) {
  EXPECT_EQ(TWShmDbgLogIPCKey(), 404226052);
  EXPECT_EQ(TWShmDbgLogIPCKey(), 0x18180004);
}

TEST_F(Record, IsLaidOutByteForByte) {
  TWDbgLogCfg record;
  memset(static_cast<void*>(&record), 0, sizeof(record));
  record.SetTimeScale(true);
  for (int categ = 0; categ < 74; ++categ) {
    record.SetLevel(static_cast<LOG_CATEG>(categ), 0x01020300 + categ);
  }
  const std::vector<uint8_t> bytes = BytesOf(record);
  ASSERT_EQ(bytes.size(), 300u);
  EXPECT_EQ(bytes[0], 1);
  for (size_t categ = 0; categ < 74; ++categ) {
    EXPECT_EQ(WordAt(bytes, 4 + 4 * categ), 0x01020300 + static_cast<int>(categ));
  }
  record.SetTimeScale(false);
  EXPECT_EQ(BytesOf(record)[0], 0);
}

TEST_F(Record, SettingAFieldLeavesTheReservedBytesAlone) {
  TWDbgLogCfg record;
  memset(static_cast<void*>(&record), 0xee, sizeof(record));
  record.SetTimeScale(false);
  record.SetLevel(LOG_CATEG_ACCOUNT, 1);
  const std::vector<uint8_t> bytes = BytesOf(record);
  EXPECT_EQ(WordAt(bytes, 0), static_cast<int32_t>(0xeeeeee00));
  EXPECT_EQ(WordAt(bytes, 4), 1);
  EXPECT_EQ(WordAt(bytes, 8), static_cast<int32_t>(0xeeeeeeee));
}

TEST_F(Record, ACategoryOutsideTheTableIsIgnoredAndReadsAsNotice) {
  TWDbgLogCfg record;
  memset(static_cast<void*>(&record), 0, sizeof(record));
  const std::vector<uint8_t> before = BytesOf(record);
  for (const int categ : {-1, 74, 1000, -1000}) {
    record.SetLevel(static_cast<LOG_CATEG>(categ), 7);
    EXPECT_EQ(record.Level(static_cast<LOG_CATEG>(categ)), 3);
  }
  EXPECT_EQ(BytesOf(record), before);
}

TEST_F(Record, AnyByteButZeroInTheFlagIsTrue) {
  TWDbgLogCfg record;
  for (const int byte : {0, 1, 2, 0xff}) {
    memset(static_cast<void*>(&record), byte, sizeof(record));
    EXPECT_EQ(record.TimeScale(), byte != 0);
  }
}

TEST_F(Record, AttachingIsReadWriteAndSeesOthersChanges) {
  SharedRecord record;
  TWDbgLogCfg* const attached = TWShmDbgLogCfgAt();
  ASSERT_NE(attached, nullptr);
  record.SetLevel(57, 6);
  EXPECT_EQ(attached->Level(LOG_CATEG_SOCKET), 6);
  attached->SetLevel(LOG_CATEG_HTTP, 5);
  EXPECT_EQ(record.Level(26), 5);
  EXPECT_EQ(shmdt(attached), 0);
}

TEST_F(Record, AttachingNeverCreatesASegment) {
  EXPECT_EQ(TWShmDbgLogCfgAt(), nullptr);
  EXPECT_EQ(shmget(kRecordKey, 0, 0), -1);
}

TEST_F(Record, InitAttachesAndFreeDetaches) {
  const SharedRecord record;
  InitDbgCfg();
  EXPECT_NE(g_pDbgLogCfg, nullptr);
  EXPECT_EQ(record.Attachments(), 1);
  FreeDbgCfg();
  EXPECT_EQ(g_pDbgLogCfg, nullptr);
  EXPECT_EQ(record.Attachments(), 0);
  FreeDbgCfg();
  EXPECT_EQ(record.Attachments(), 0);
}

TEST_F(Record, EachFailureOfAttachingReturnsNullWithoutAMessage) {
  const SharedRecord record;
  for (const Call call : {Call::kShmget, Call::kShmat}) {
    EXPECT_EQ(ForEachFailingCall(call,
                                 [](Faults& faults) {
                                   InitDbgCfg();
                                   EXPECT_EQ(g_pDbgLogCfg == nullptr, faults.Struck());
                                   FreeDbgCfg();
                                 }),
              1);
  }
  EXPECT_EQ(record.Attachments(), 0);
  EXPECT_FALSE(FileExists(kMainLog));
}

TEST_F(Record, ASegmentThatMayNotBeReadIsNotAttached) {
  const SharedRecord record;
  const int id = shmget(kRecordKey, 0, 0);
  shmid_ds status = {};
  ASSERT_EQ(shmctl(id, IPC_STAT, &status), 0);
  status.shm_perm.mode = 0600;
  ASSERT_EQ(shmctl(id, IPC_SET, &status), 0);
  const ChildResult result = RunInChild([] {
    if (setgid(65534) != 0 || setuid(65534) != 0) return 2;
    InitDbgCfg();
    return g_pDbgLogCfg == nullptr ? 0 : 1;
  });
  if (result.code == 2) GTEST_SKIP() << "only one user in this namespace";
  EXPECT_EQ(result.code, 0);
}

}  // namespace
