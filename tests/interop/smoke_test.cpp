#include "tests/interop/servers.h"
TEST(Smoke, Starts) {
  EXPECT_GT(Apache().Port(), 0);
  EXPECT_GT(Nginx().Port(), 0);
  EXPECT_GT(Lighttpd().Port(), 0);
  for (WebServer* s : {&Apache(), &Lighttpd()}) {
    for (const Mode& mode : kModes) {
      auto c = NewClient(*s, LoginTo(mode, "digest/text.cgi?a=1"));
      EXPECT_EQ(c->SendRequest(HTTP_METHOD_GET, ""), 0);
      std::cout << c->m_strAuthenticate << s->Name() << NameOf(mode) << StatusOf(c.get()) << BodyOf(c.get());
    }
  }
      auto c = NewClient(Apache(), LoginTo(kModes[0], "digest-plain/text.cgi?a=1"));
      EXPECT_EQ(c->SendRequestByGet(), 0);
      std::cout << c->m_strAuthenticate;
      EXPECT_EQ(c->SendRequest(HTTP_METHOD_GET, ""), 0);
      std::cout << StatusOf(c.get()) << BodyOf(c.get());
  ClientSettings x = LoginTo(kModes[0], "cgi/count.cgi");
  for (int port : {Apache().Port("LENIENT_PORT"), Lighttpd().Port(), Apache().Port(), Nginx().Port()}) {
    ClientProbe c(port, x);
    EXPECT_EQ(c.OpenRawDataUpload(), 0);
    std::string end = "hello\r\n-------------QUENMULTIPART_BOUNDARY-------------\r\n";
    std::cout << c.WriteData(end.data(), int(end.size())) << "\n";
    if (c.HasDataToRead(2)) std::cout << "REPLY " << c.GetResp() << StatusOf(&c) << c.m_statusCode << "\n";
  }
  std::cout << ReadFile(Apache().File("error.log")) << ReadFile(Lighttpd().File("error.log"));
}
