// A plugin of QEMU's user emulator that counts what the emulated process executes: bench/count
// loads it for an architecture that callgrind is not there for.
//
//   qemu-arm -plugin PLUGIN,out=FILE PROGRAM [ARGUMENT...]
//
// At its end the process writes "INSTRUCTIONS SYSTEM_CALLS" to FILE. An instruction is
// counted when it is reached, also when its condition keeps it from doing anything. A child that was
// forked counts for itself and, killed by a signal, writes nothing.
//
// Debian ships no header with these functions, so those that are needed stand here: version 1 of
// the interface, which QEMU 7.2 speaks.
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <cstring>

extern "C" {

using PluginId = uint64_t;
struct qemu_plugin_tb;
struct qemu_plugin_insn;

enum InlineOperation { kInlineAddU64 };

void qemu_plugin_register_vcpu_tb_trans_cb(PluginId id, void (*call)(PluginId, qemu_plugin_tb*));
size_t qemu_plugin_tb_n_insns(const qemu_plugin_tb* block);
qemu_plugin_insn* qemu_plugin_tb_get_insn(const qemu_plugin_tb* block, size_t index);
void qemu_plugin_register_vcpu_insn_exec_inline(qemu_plugin_insn* instruction,
                                                InlineOperation operation, void* counter,
                                                uint64_t by);
void qemu_plugin_register_vcpu_syscall_cb(PluginId id,
                                          void (*call)(PluginId, unsigned, int64_t, uint64_t,
                                                       uint64_t, uint64_t, uint64_t, uint64_t,
                                                       uint64_t, uint64_t, uint64_t));
void qemu_plugin_register_atexit_cb(PluginId id, void (*call)(PluginId, void*), void* context);

__attribute__((visibility("default"))) extern const int qemu_plugin_version;
const int qemu_plugin_version = 1;
}

namespace {

uint64_t instructions, systemCalls;
FILE* result;

void CountBlock(PluginId /*id*/, qemu_plugin_tb* block) {
  for (size_t i = 0; i < qemu_plugin_tb_n_insns(block); ++i) {
    qemu_plugin_register_vcpu_insn_exec_inline(qemu_plugin_tb_get_insn(block, i), kInlineAddU64,
                                               &instructions, 1);
  }
}

void CountSystemCall(PluginId /*id*/, unsigned /*processor*/, int64_t /*number*/, uint64_t,
                     uint64_t, uint64_t, uint64_t, uint64_t, uint64_t, uint64_t, uint64_t) {
  ++systemCalls;
}

void WriteResult(PluginId /*id*/, void* /*context*/) {
  std::fprintf(result, "%llu %llu\n", static_cast<unsigned long long>(instructions),
               static_cast<unsigned long long>(systemCalls));
  std::fclose(result);
}

}  // namespace

extern "C" __attribute__((visibility("default"))) int qemu_plugin_install(PluginId id,
                                                                          const void* /*emulator*/,
                                                                          int count,
                                                                          char** options) {
  if (count != 1 || std::strncmp(options[0], "out=", 4) != 0) return -1;
  result = std::fopen(options[0] + 4, "we");
  if (result == nullptr) return -1;
  qemu_plugin_register_vcpu_tb_trans_cb(id, CountBlock);
  qemu_plugin_register_vcpu_syscall_cb(id, CountSystemCall);
  qemu_plugin_register_atexit_cb(id, WriteResult, nullptr);
  return 0;
}
