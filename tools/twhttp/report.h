// What a session has to tell, for people and as JSON.
#ifndef TARNWICK_TOOLS_TWHTTP_REPORT_H_
#define TARNWICK_TOOLS_TWHTTP_REPORT_H_

#include <json/value.h>

#include <string>

#include "tools/twhttp/session.h"

// The failure's explanation, in lines.
std::string FailureText(const Session& session, bool colour);

// The exchanges with their heads, rules, challenge and credentials; and the log.
std::string ExchangesText(const Session& session, bool colour);

// What was odd about the last response, though it need not have failed for it.
std::string NotesText(const Session& session);

std::string TimingsText(const Session& session, bool colour);

Json::Value ReportJson(const Session& session);

#endif  // TARNWICK_TOOLS_TWHTTP_REPORT_H_
