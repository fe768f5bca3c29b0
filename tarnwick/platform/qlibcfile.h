// The platform's two settings-file functions: one key of a text file, by path.
//
// The file holds one `key="value"` pair per line. Blanks around the key and a value without quotes
// are accepted when reading; lines that start with "#" and lines of any other shape are left alone.
// When a key is on several lines, the first one is meant. It is a regular file of at most 1 MiB:
// a directory, a FIFO or a device at its path is refused without a wait, unread and unwritten.
//
// libtarnwick has a stand-alone version of both. They are weak symbols: a program that has
// functions of these names in its own objects replaces them, whether it links the shared library or
// the archive. Functions of another archive must be pulled into the program, with --whole-archive
// for example, because a linker does not look for what it has already. Neither function is a
// cancellation point, and neither logs.
//
// errno after -1 is EINVAL when an argument is not what the function requires or the path leads to
// a FIFO or a device; EISDIR for a directory; EFBIG when the text is longer than 1 MiB, or would
// be; ELOOP for a symbolic link that is not followed, or for links without an end; ENOMEM without
// memory; otherwise that of the system call that failed, EPERM when the owner of the file cannot be
// kept.
#ifndef TARNWICK_PLATFORM_QLIBCFILE_H_
#define TARNWICK_PLATFORM_QLIBCFILE_H_

#include "tarnwick/platform/export.h"

extern "C" {

// Reads the value of `key` from the file at `path` into `value`.
//
// Arguments: `size` is the size of `value` in bytes; at most size - 1 bytes of the value and a
//   terminating zero byte are stored. `flags` is ignored.
// Results: the length of the whole value in bytes when the key was found, also when the buffer held
//   only a part of it; 0 when the key is not in the file or its value is empty; -1 when the file
//   could not be read or an argument is null, empty or not positive.
// A symbolic link is followed, whoever made it: nothing is written.
// After 0, `value` is an empty string; after -1, `value` is untouched.
// Threads: safe from any thread and process. A reader never sees a half-written file. Does not wait
//   for writers.
TARNWICK_API int QLIBCFileGetKeyValue(const char* path, const char* key, char* value, int size,
                                      int flags);

// Sets `key` to `value` in the file at `path`, which is created when it is missing.
//
// Arguments: `format` is the line to write, with two "%s" for key and value in this order and no
//   other conversion but "%%", for example "%s=\"%s\"\n". The key is a word without blanks, "=" and
//   "#", the value holds no line feed: the file could not be read back.
// Results: 0 on success; -1 on failure, with the file as it was.
// The file is replaced in one step (written beside the old one, synchronised, renamed over it), so
//   a reader or a crash finds the old or the new text. Other keys, comments and unknown lines, the
//   file's mode and its owner stay; when the owner cannot be kept, the call fails. The text is
//   written after the new file has all three, and before that the new file gives no right that the
//   old one does not give its owner. A new file gets mode 0644 less the umask.
// A symbolic link at the path is followed and stays a link when it belongs to root or to the caller
//   (effective user), and so is one that it leads to; any other user's is refused (ELOOP), wherever
//   it points. A link to a missing file is refused (ENOENT). The directories of the path are those
//   that the system finds: keep them closed to other users.
// Threads: safe from any thread and process. Writers, whether they lock the settings file
//   themselves or not, wait for each other on a lock of the directory for as long as it takes, and
//   for the disk.
TARNWICK_API int QLIBCFileSetKeyValue(const char* path, const char* key, const char* value,
                                      const char* format);

}  // extern "C"

#endif  // TARNWICK_PLATFORM_QLIBCFILE_H_
