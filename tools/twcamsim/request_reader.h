// Reads requests from a connection.
#ifndef TARNWICK_TOOLS_TWCAMSIM_REQUEST_READER_H_
#define TARNWICK_TOOLS_TWCAMSIM_REQUEST_READER_H_

#include <chrono>
#include <memory>
#include <string>

#include "tools/twcamsim/behaviour.h"
#include "tools/twcamsim/connection.h"
#include "tools/twcamsim/memory_budget.h"
#include "tools/twcamsim/request.h"

enum class Reading {
  kDone,
  kNothing,  // the peer ended the connection between two requests
  kBroken,   // it did so inside of one, or the connection failed; Result tells
  kBad,      // what came is no HTTP; the request's `deviation` tells
  kFull,     // all connections together hold as much as they may
  kLimit,    // the behaviour's limit is reached
};

// Threads: one at a time.
class RequestReader {
 public:
  using Milliseconds = std::chrono::milliseconds;

  RequestReader(Connection* connection, const Behaviour& behaviour, Milliseconds limit,
                MemoryBudget* budget);
  ~RequestReader();

  // Reads up to the blank line. What the request before held is given back to the budget.
  Reading ReadHead(Request* request);

  // Reads the body that the head announces, chunks decoded.
  Reading ReadBody(Request* request);

  // Hands out what comes after the head, as it comes, without regard to the announced length.
  Io ReadStream(std::string* bytes);

  // How the last read of the connection went.
  Io Result() const { return result_; }

 private:
  struct Parser;

  Io ReadMore();
  void Release();
  size_t HeadSize();
  Reading Parse(Request* request);

  Connection* connection_;
  const Behaviour& behaviour_;
  const Milliseconds limit_;
  Io result_ = Io::kDone;
  std::string pending_;  // came, and belongs to nothing yet
  size_t searched_ = 0;  // of pending_, for the end of the head
  int64_t taken_ = 0;    // of the behaviour's limit
  MemoryBudget* budget_;
  size_t held_ = 0;  // of the budget
  bool full_ = false;
  std::unique_ptr<Parser> parser_;
};

#endif  // TARNWICK_TOOLS_TWCAMSIM_REQUEST_READER_H_
