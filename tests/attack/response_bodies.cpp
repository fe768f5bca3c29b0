// Bodies of the grammar: JSON, XML, text and bytes.
#include "tests/attack/response.h"

namespace {

using namespace std::string_literals;

std::string Repeated(const std::string& text, size_t count) {
  std::string all;
  all.reserve(text.size() * count);
  for (size_t i = 0; i < count; ++i) all += text;
  return all;
}

const std::string kJson[] = {
    "{\"success\":true}",
    "{\"success\":\"true\"}",
    "{\"success\":1}",
    "{\"success\":null,\"success\":true}",
    "{\"success\":true,\"value\":1e999999}",
    "{\"success\":true,\"value\":-99999999999999999999999999999999}",
    "{\"success\":true,\"value\":\"\\ud800\"}",
    "{\"success\":true,\"value\":\"\\udc00\\ud800\"}",
    "{\"success\":true,\"value\":\"\xff\xfe\xc0\x80\"}",
    "{\"success\":true,\"value\":\"\x1b[2J\x07\"}",
    "{\"success\":true}\0{\"success\":true}"s,
    "{\"success\":true} trailing \x1b[31m",
    "{\"success\":true",
    "{\"success\":tru",
    "[{\"success\":true}]",
    "\"success\"",
    "true",
    "null",
    "1",
    "[",
    "]",
    "{",
    "{\"a\":}",
    "{\"a\":1,}",
    "{'success':true}",
    "{success:true}",
    "/* comment */{\"success\":true}",
    "{\"success\":true// comment",
    "\xef\xbb\xbf{\"success\":true}",
    "NaN",
    "{\"success\":NaN}",
    "{\"error\":true}",
    "\n\n\nNov 22 04:40:00 [1][camera][alarm] camerad:57:Watch(): forged\n",
    "\\u0000\\u001b",
};

const std::string kXml[] = {
    "<a/>",
    "<a>",
    "<a></b>",
    "</a>",
    "<a b=\"c\" b=\"d\"/>",
    "<a>&undefined;</a>",
    "<a>&#0;&#x110000;&#xffffffff;</a>",
    "<a>&lt;&amp;&#65;</a>",
    "<a xmlns:x=\"y\"><x:b/><z:c/></a>",
    "<?xml version=\"1.0\" encoding=\"UTF-16\"?><a/>",
    "<?xml version=\"1.0\" encoding=\"EBCDIC-CP-US\"?><a/>",
    "<?xml version=\"9.9\" encoding=\"nonsense\"?><a/>",
    "<!DOCTYPE a SYSTEM \"file:///etc/passwd\"><a/>",
    "<!DOCTYPE a [<!ENTITY x SYSTEM \"file:///etc/passwd\">]><a>&x;</a>",
    "<!DOCTYPE a [<!ENTITY x SYSTEM \"http://127.0.0.1:1/\">]><a>&x;</a>",
    "<!DOCTYPE a [<!ENTITY % x SYSTEM \"file:///dev/zero\">%x;]><a/>",
    "<!DOCTYPE a [<!ENTITY x \"&x;\">]><a>&x;</a>",
    "<!DOCTYPE a [<!ENTITY x \"&y;\"><!ENTITY y \"&x;\">]><a>&x;</a>",
    "<!DOCTYPE a [<!ATTLIST a b CDATA \"&#60;\">]><a/>",
    "<!DOCTYPE a [<!ELEMENT a (a|a|a|a)*>]><a/>",
    "<a><![CDATA[ ]] ]>]]></a>",
    "<a><!-- -- --></a>",
    "<?php ?><a/>",
    "<a>\x01\x02</a>",
    "<a>\xff\xfe</a>",
    "<a>\0</a>"s,
    "\xff\xfe<\0a\0/\0>\0"s,
    "\xfe\xff\0<\0a\0/\0>"s,
    "<xi:include xmlns:xi=\"http://www.w3.org/2001/XInclude\" href=\"/etc/passwd\"/>",
    "text",
};

std::string EntityBomb(Dice* dice) {
  const size_t depth = dice->Between(2, 12);
  std::string text = "<!DOCTYPE a [<!ENTITY e0 \"ha\">";
  for (size_t i = 1; i <= depth; ++i) {
    const std::string part = "&e" + std::to_string(i - 1) + ";";
    text += "<!ENTITY e" + std::to_string(i) + " \"" + Repeated(part, 10) + "\">";
  }
  const std::string last = "&e" + std::to_string(depth) + ";";
  return text + "]><a" + (dice->OneIn(2) ? " b=\"" + last + "\"/>" : ">" + last + "</a>");
}

std::string QuadraticBomb(Dice* dice) {
  const std::string entity = std::string(dice->Between(100, 5000), 'x');
  return "<!DOCTYPE a [<!ENTITY e \"" + entity + "\">]><a>" +
         Repeated("&e;", dice->Between(10, 1000)) + "</a>";
}

std::string HostileXml(Dice* dice) {
  const size_t depth = dice->OneIn(10) ? dice->Between(200, 20000) : dice->Between(1, 200);
  switch (dice->Below(12)) {
    case 0:
      return EntityBomb(dice);
    case 1:
      return QuadraticBomb(dice);
    case 2:
      return Repeated("<a>", depth) + Repeated("</a>", depth);
    case 3:
      return Repeated("<a>", depth);
    case 4:
      return "<a" + Repeated(" b" + dice->Letters(3) + "=\"c\"", depth) + "/>";
    default:
      return dice->Pick(kXml);
  }
}

std::string HostileJson(Dice* dice) {
  const size_t depth = dice->OneIn(10) ? dice->Between(200, 50000) : dice->Between(1, 200);
  switch (dice->Below(12)) {
    case 0:
      return Repeated("[", depth) + Repeated("]", depth);
    case 1:
      return Repeated("{\"a\":", depth) + "1" + Repeated("}", depth);
    case 2:
      return Repeated("[{\"a\":", depth);
    case 3:
      return "{\"success\":true,\"value\":\"" + dice->Bytes(dice->Below(300)) + "\"}";
    case 4:
      return "{\"value\":" + Repeated("9", depth) + "}";
    default:
      return dice->Pick(kJson);
  }
}

std::string PlainText(Dice* dice) {
  size_t size = dice->Below(400);
  if (dice->OneIn(20)) size = dice->Between(400, 20000);
  if (dice->OneIn(400)) size = dice->Between(60000, 1500000);
  if (size < 20000 && dice->OneIn(2)) return dice->Bytes(size);
  const std::string line = dice->Letters(dice->Between(1, 90)) + (dice->OneIn(2) ? "\r\n" : "\n");
  return Repeated(line, size / line.size() + 1);
}

}  // namespace

std::string CleanBody(BodyKind kind, Dice* dice) {
  if (kind == BodyKind::kJson) {
    return "{\"success\":true,\"value\":\"" + dice->Letters(dice->Below(200)) + "\"}";
  }
  if (kind == BodyKind::kXml) return "<a><b>" + dice->Letters(dice->Below(200)) + "</b></a>";
  return PlainText(dice);
}

std::string HostileBody(BodyKind kind, Dice* dice) {
  const size_t choice = dice->Below(10);
  if (choice == 0) return "";
  if (choice == 1) return PlainText(dice);
  if (choice == 2) return dice->OneIn(2) ? HostileXml(dice) : HostileJson(dice);
  if (kind == BodyKind::kXml) return HostileXml(dice);
  if (kind == BodyKind::kJson) return HostileJson(dice);
  return PlainText(dice);
}
