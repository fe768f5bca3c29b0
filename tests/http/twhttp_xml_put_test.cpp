// The PUT of a document that libxml2 fails to write.
#include <gmock/gmock.h>
#include <libxml/parser.h>
#include <libxml/tree.h>

#include <memory>

#include "tests/http/http_test_util.h"
#include "tests/support/faults.h"

namespace {

using ::testing::ElementsAre;

TEST(SendReqByXMLPut, AnyNegativeResultOfWritingTheDocumentIsAFailure) {
  const std::unique_ptr<xmlDoc, decltype(&xmlFreeDoc)> owner(xmlParseMemory("<r/>", 4), xmlFreeDoc);
  xmlDoc* doc = owner.get();
  for (const long result : {-1, -2, -1547}) {
    const DescriptorGuard guard;  // the temporary file is closed
    ExposedClient client(80);
    LogCapture log;
    Faults faults;
    faults.FailNth(Call::kXmlDocDump, 1, 0, result);
    EXPECT_EQ(client.SendReqByXMLPut(doc), HTTP_RET_IO_ERROR);
    EXPECT_EQ(client.m_result, HTTP_RET_IO_ERROR);
    EXPECT_FALSE(faults.HasOption(CURLOPT_INFILESIZE_LARGE));
    EXPECT_EQ(faults.Count(Call::kCurlEasyPerform), 0);
    EXPECT_THAT(log.Lines(), ElementsAre(IsHttpLog("debug", "SendReqByXMLPut",
                                                   "Failed to write xml document to temp file\n")));
  }
}

}  // namespace
