#include "tests/soak/statistics.h"

#include <cstdio>

namespace {

constexpr size_t kDetailsKept = 20;
constexpr const char* kKindNames[] = {"right", "cut", "failed", "wrong"};

unsigned Bit(Outcome::Kind kind) {
  return 1U << kind;
}

unsigned Allowed(Fault fault) {
  switch (fault) {
    case Fault::kNone:
    case Fault::kSlow:
      return Bit(Outcome::kRight);
    case Fault::kCutHead:  // after the status line it is a head without a body
    case Fault::kCutBody:
    case Fault::kResetBody:
    case Fault::kStallBody:
    case Fault::kBadChunk:
      return Bit(Outcome::kFailed) | Bit(Outcome::kCut);
    case Fault::kLongLength:
      return Bit(Outcome::kFailed) | Bit(Outcome::kRight);
    case Fault::kShortLength:  // which a body that ends with the connection does not ask for
      return Bit(Outcome::kFailed) | Bit(Outcome::kCut) | Bit(Outcome::kRight);
    default:
      return Bit(Outcome::kFailed);
  }
}

// Those that do not look at the body succeed where only that is spoilt; the first one does
// not even look at the status.
unsigned AllowedBlindly(const Plan& plan) {
  const bool connected = plan.fault > Fault::kBadCertificate;
  const bool through =
      plan.fault == Fault::kHangUp || plan.fault == Fault::kNoise || plan.fault == Fault::kSilence;
  if (!UsesCurl(plan) && Has(plan, kReadsNothing) && (connected || through)) {
    return Bit(Outcome::kRight);
  }
  const bool spoilt = plan.fault >= Fault::kCutHead && plan.fault <= Fault::kBadChunk;
  return UsesCurl(plan) && Has(plan, kReadsNothing) && spoilt ? Bit(Outcome::kRight) : 0;
}

}  // namespace

bool IsExpected(const Plan& plan, const Outcome& outcome) {
  return ((Allowed(plan.fault) | AllowedBlindly(plan)) & Bit(outcome.kind)) != 0;
}

void Statistics::AddTo(Count* count, const Plan& plan, const Outcome& outcome) {
  ++count->all;
  const bool fault = plan.fault > Fault::kSlow;
  if (fault) ++count->faults;
  if (!IsExpected(plan, outcome)) {
    ++count->unexpected;
  } else if (outcome.kind == Outcome::kCut) {
    ++count->cut;
  } else if (outcome.kind == Outcome::kFailed) {
    ++count->failed;
  } else {
    ++(fault ? count->right_despite : count->right);
  }
}

void Statistics::Add(const Plan& plan, const Outcome& outcome) {
  const std::lock_guard<std::mutex> lock(mutex_);
  AddTo(&total_, plan, outcome);
  AddTo(&operations_[static_cast<size_t>(plan.operation)], plan, outcome);
  AddTo(&faults_[static_cast<int>(plan.fault)], plan, outcome);
  if (IsExpected(plan, outcome) || details_.size() >= kDetailsKept) return;
  details_.push_back(std::string(OperationOf(plan).title) + (plan.tls ? ", TLS" : "") +
                     ", fault: " + NameOf(plan.fault) + ", " + ToPath(plan) + ": " +
                     kKindNames[outcome.kind] + " " + outcome.detail);
}

unsigned long Statistics::Operations() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return total_.all;
}

unsigned long Statistics::Unexpected() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  return total_.unexpected;
}

void Statistics::PrintRow(const char* name, const Count& count) {
  printf("%-28s %9lu %9lu %8lu %8lu %8lu %8lu %10lu\n", name, count.all, count.right, count.faults,
         count.failed, count.cut, count.right_despite, count.unexpected);
}

void Statistics::Print() const {
  const std::lock_guard<std::mutex> lock(mutex_);
  constexpr char kHead[] = "\n%-28s %9s %9s %8s %8s %8s %8s %10s\n";
  printf(kHead, "operation", "all", "right", "faults", "= failed", "+ cut", "+ right",
         "unexpected");
  for (size_t i = 0; i < operations_.size(); ++i) {
    PrintRow(SoakOperations()[i].title, operations_[i]);
  }
  PrintRow("all", total_);
  printf(kHead, "fault", "all", "right", "faults", "= failed", "+ cut", "+ right", "unexpected");
  for (int i = 0; i < kFaults; ++i) PrintRow(NameOf(static_cast<Fault>(i)), faults_[i]);
  for (const std::string& detail : details_) printf("unexpected: %s\n", detail.c_str());
}
