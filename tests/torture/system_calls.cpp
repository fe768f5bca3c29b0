#include "tests/torture/system_calls.h"

#include <link.h>
#include <linux/filter.h>
#include <linux/seccomp.h>
#include <signal.h>
#include <sys/prctl.h>
#include <sys/syscall.h>
#include <ucontext.h>

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <cstring>
#include <vector>

#include "tests/torture/injection.h"

#ifndef __x86_64__
#error "the registers and the system call instruction below are those of amd64"
#endif

// The one place from which the filter lets every call through.
extern "C" long TortureSystemCall(long number, long a, long b, long c, long d, long e, long f);
extern "C" const char TortureSystemCallEnd[];
asm(R"(
.text
.globl TortureSystemCall
.type TortureSystemCall, @function
TortureSystemCall:
  mov %rdi, %rax
  mov %rsi, %rdi
  mov %rdx, %rsi
  mov %rcx, %rdx
  mov %r8, %r10
  mov %r9, %r8
  mov 8(%rsp), %r9
  syscall
.globl TortureSystemCallEnd
TortureSystemCallEnd:
  ret
.size TortureSystemCall, . - TortureSystemCall
)");

namespace {

struct NumberedCall {
  long number;
  CallKind kind;
};

constexpr int kNoLength = -1;

// Name, number and usual error of the calls that fail in a way of their own; any other fails with
// EIO.
#define PLAIN(name, error)                  \
  {                                         \
    SYS_##name, {                           \
#name, error, kNoLength, false, false \
    }                                       \
  }
#define MOVES_BYTES(name, error)    \
  {                                 \
    SYS_##name, {                   \
#name, error, 2, false, false \
    }                               \
  }
#define DONE_ANYWAY(name, error)           \
  {                                        \
    SYS_##name, {                          \
#name, error, kNoLength, true, false \
    }                                      \
  }
constexpr NumberedCall kCalls[] = {
    PLAIN(socket, EMFILE),
    PLAIN(connect, ENETUNREACH),
    PLAIN(bind, EADDRNOTAVAIL),
    PLAIN(getsockopt, ENOBUFS),
    PLAIN(setsockopt, ENOPROTOOPT),
    PLAIN(getsockname, ENOBUFS),
    PLAIN(getpeername, ENOTCONN),
    PLAIN(socketpair, EMFILE),
    PLAIN(eventfd2, EMFILE),
    PLAIN(poll, ENOMEM),
    PLAIN(ppoll, ENOMEM),
    PLAIN(pselect6, ENOMEM),
    PLAIN(fcntl, EINVAL),
    PLAIN(ioctl, EINVAL),
    PLAIN(openat, EMFILE),
    PLAIN(open, EMFILE),
    PLAIN(fstat, EIO),
    PLAIN(newfstatat, EACCES),
    PLAIN(lseek, EIO),
    PLAIN(flock, ENOLCK),
    PLAIN(fsync, EIO),
    PLAIN(fchmod, EPERM),
    PLAIN(fchown, EPERM),
    PLAIN(rename, EIO),
    PLAIN(unlink, EACCES),
    PLAIN(readlink, EACCES),
    PLAIN(readlinkat, EACCES),
    PLAIN(shmget, ENOENT),
    PLAIN(shmat, EACCES),
    PLAIN(mmap, ENOMEM),
    PLAIN(mprotect, ENOMEM),
    PLAIN(getrandom, ENOSYS),
    PLAIN(clock_nanosleep, EINTR),
    PLAIN(sysinfo, EFAULT),
    MOVES_BYTES(read, EIO),
    MOVES_BYTES(write, ENOSPC),
    MOVES_BYTES(recvfrom, ECONNRESET),
    MOVES_BYTES(sendto, ECONNRESET),
    DONE_ANYWAY(close, EIO),
    DONE_ANYWAY(shmdt, EINVAL),
    // Gives EAGAIN, truly, when there is no signal to take back.
    {SYS_rt_sigtimedwait, {"rt_sigtimedwait", EINTR, kNoLength, false, true}},
};
#undef PLAIN
#undef MOVES_BYTES
#undef DONE_ANYWAY

constexpr CallKind kOtherCall = {"another system call", EIO, kNoLength, false, false};

// Let through by the filter: they do not fail for a caller with valid arguments, and the C library
// makes some of them while all signals are blocked, when a trap would end the process.
constexpr long kUntrapped[] = {
    SYS_rt_sigreturn, SYS_rt_sigprocmask, SYS_rt_sigaction,    SYS_sigaltstack,
    SYS_futex,        SYS_clone,          SYS_clone3,          SYS_exit,
    SYS_exit_group,   SYS_rseq,           SYS_set_robust_list, SYS_tgkill,
    SYS_gettid,       SYS_getpid,         SYS_getuid,          SYS_geteuid,
    SYS_getgid,       SYS_getegid,        SYS_munmap,          SYS_madvise,
    SYS_brk,          SYS_sched_yield,    SYS_clock_gettime,   SYS_gettimeofday,
    SYS_time,         SYS_uname,          SYS_umask,           SYS_restart_syscall,

    SYS_pipe2,  // by which the undefined behaviour sanitizer looks whether memory is readable
};

const CallKind& KindOf(long number) {
  for (const NumberedCall& call : kCalls) {
    if (call.number == number) return call.kind;
  }
  return kOtherCall;
}

// The sanitizers' runtimes, whose own calls are not the operation's.
struct Range {
  uintptr_t begin;
  uintptr_t end;
};
constexpr int kMostRuntimes = 4;
Range g_runtimes[kMostRuntimes];
int g_runtime_count = 0;

int NoteRuntime(struct dl_phdr_info* info, size_t /*size*/, void* /*unused*/) {
  if (strstr(info->dlpi_name, "san.so") == nullptr) return 0;
  for (int i = 0; i < info->dlpi_phnum && g_runtime_count < kMostRuntimes; ++i) {
    const ElfW(Phdr)& part = info->dlpi_phdr[i];
    if (part.p_type != PT_LOAD || (part.p_flags & PF_X) == 0) continue;
    const uintptr_t begin = info->dlpi_addr + part.p_vaddr;
    g_runtimes[g_runtime_count++] = {begin, begin + part.p_memsz};
  }
  return 0;
}

bool IsRuntime(const void* address) {
  const auto value = reinterpret_cast<uintptr_t>(address);
  for (const Range& runtime : g_runtimes) {
    if (value >= runtime.begin && value < runtime.end) return true;
  }
  return false;
}

long Make(const greg_t* registers, const CallKind& kind, bool one_byte) {
  long arguments[] = {registers[REG_RDI], registers[REG_RSI], registers[REG_RDX],
                      registers[REG_R10], registers[REG_R8],  registers[REG_R9]};
  if (one_byte && arguments[kind.length] > 1) arguments[kind.length] = 1;
  return TortureSystemCall(registers[REG_RAX], arguments[0], arguments[1], arguments[2],
                           arguments[3], arguments[4], arguments[5]);
}

long Decide(const greg_t* registers) {
  const CallKind& kind = KindOf(registers[REG_RAX]);
  const Verdict verdict = NextCall(kind);
  if (verdict.kind == Verdict::kFail) return -verdict.error;
  const long result = Make(registers, kind, verdict.kind == Verdict::kShort);
  return verdict.kind == Verdict::kFailDone ? -verdict.error : result;
}

void OnTrap(int /*signal*/, siginfo_t* info, void* context) {
  greg_t* const registers = static_cast<ucontext_t*>(context)->uc_mcontext.gregs;
  const bool counts = t_injection.armed && !IsRuntime(info->si_call_addr);
  registers[REG_RAX] = counts ? Decide(registers) : Make(registers, kOtherCall, false);
}

sock_filter Load(size_t offset) {
  return BPF_STMT(BPF_LD | BPF_W | BPF_ABS, static_cast<uint32_t>(offset));
}

// Skips `yes` or `no` instructions.
sock_filter IfEqual(uint64_t value, size_t yes, size_t no) {
  return BPF_JUMP(BPF_JMP | BPF_JEQ | BPF_K, static_cast<uint32_t>(value),
                  static_cast<uint8_t>(yes), static_cast<uint8_t>(no));
}

std::vector<sock_filter> Filter() {
  constexpr size_t kPlace = offsetof(seccomp_data, instruction_pointer);
  const size_t count = sizeof(kUntrapped) / sizeof(kUntrapped[0]);
  const auto stub = reinterpret_cast<uint64_t>(TortureSystemCallEnd);
  std::vector<sock_filter> filter = {Load(kPlace), IfEqual(stub & 0xffffffff, 0, 2),
                                     Load(kPlace + 4), IfEqual(stub >> 32, count + 2, 0),
                                     Load(offsetof(seccomp_data, nr))};
  for (size_t i = 0; i < count; ++i) {
    filter.push_back(IfEqual(static_cast<uint64_t>(kUntrapped[i]), count - i, 0));
  }
  filter.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_TRAP));
  filter.push_back(BPF_STMT(BPF_RET | BPF_K, SECCOMP_RET_ALLOW));
  return filter;
}

}  // namespace

bool TrapSystemCalls() {
  g_runtime_count = 0;
  dl_iterate_phdr(NoteRuntime, nullptr);
  struct sigaction action = {};
  action.sa_sigaction = OnTrap;
  action.sa_flags = SA_SIGINFO | SA_NODEFER;  // a cancelled thread leaves the handler for good
  if (sigaction(SIGSYS, &action, nullptr) != 0) return false;
  std::vector<sock_filter> filter = Filter();
  const sock_fprog program = {static_cast<unsigned short>(filter.size()), filter.data()};
  return prctl(PR_SET_NO_NEW_PRIVS, 1, 0, 0, 0) == 0 &&
         prctl(PR_SET_SECCOMP, SECCOMP_MODE_FILTER, &program) == 0;
}
