// The class definition compiler as a library.
//
// One call compiles one class definition source into one class definition
// database (CDB) image, exactly as the qecfg command line does: the same
// bytes, the same traces, and on failure the same message and status.
//
//   qecfg::options opt;
//   opt.output_name = "disk.cdef";            // what an unnamed class is named after
//   std::vector<std::uint8_t> image;
//   qecfg::result r = qecfg::compile_to_memory(qecfg::source::file("disk.src"), image, opt);
//   if (!r) std::fputs(r.message.c_str(), stderr), std::exit(r.status);
//
// A source held in memory still has a name, used wherever a message or a
// trace names the source file:
//
//   qecfg::source::bytes("generated.src", text)
//
// Compiling to a file replaces the output atomically where it can (see
// compile_to_file). Calls are independent: nothing is shared between them but
// the trace streams they are given.
#ifndef QECFG_QECFG_H
#define QECFG_QECFG_H

#include <cstdint>
#include <cstdio>
#include <string>
#include <string_view>
#include <vector>

#include "qecfg/messages.h"

namespace qecfg {

// The command line's options.
struct options {
    // -s: the image in the byte order opposite to this machine's.
    bool reverse_byte_order = false;
    // -d level: above 1 every statement and mask change is traced, above 2
    // every table allocation.
    int trace_level = 0;
    // -n clears it: the fatal message then has no final newline.
    bool message_newline = true;
    // The name an unnamed class is named after: the text up to its first
    // ".cdef" (a name without ".cdef" makes such a source fail). When empty,
    // compile_to_file uses the output path, as the command line does.
    std::string output_name;
    // Where traces go: level 3's table growth lines on trace_err, all the
    // other traces on trace_out.
    std::FILE *trace_out = stdout;
    std::FILE *trace_err = stderr;
    // compile_to_file: leave the flushes of the output file and its directory
    // to the system (faster, but a power loss may then lose the output or keep
    // the old one although the compile reported success).
    bool skip_disk_flush = false;
};

// Where the source comes from. The bytes of an in-memory source are not
// copied: they must stay valid for the call.
struct source {
    std::string name;      // the path, or the name messages give an in-memory source
    std::string_view text; // the source itself, when in_memory
    bool in_memory = false;

    static source file(std::string path) { return source{std::move(path), {}, false}; }
    static source bytes(std::string name, std::string_view text) { return source{std::move(name), text, true}; }
};

// The outcome of a compile. status is 0 on success; otherwise it is the exit
// status the command line gives (1, or the system's error number when the
// source cannot be opened or read, or memory runs out) and message is the
// full text the command line prints on standard error, newline included
// unless options::message_newline is false.
struct result {
    int status = 0;
    std::string message;
    // The message as data: its row in the table of messages (messages.h),
    // the row's stable name, and the line printed before it (0 for none).
    message_id id = message_id::none;
    const char *name = "none";
    std::uint64_t line = 0;

    explicit operator bool() const { return status == 0; }
};

// Compiles into a buffer the caller owns. On success the buffer holds exactly
// the image; on failure it is left empty.
result compile_to_memory(const source &src, std::vector<std::uint8_t> &image, const options &opt = {});

// Compiles into the file output_path, as the command line does.
//
// An existing regular file (or the file a symbolic link designates) is
// replaced atomically: the image is written to a new temporary file in the
// same directory that others cannot open (unnamed where the file system
// allows), given its final mode before any byte (a replaced file's permission
// bits without set-user-ID and set-group-ID, and its owner and group where
// allowed), flushed to disk and renamed over the name, and the directory is
// flushed after. Any failure removes the temporary file and leaves the name
// as it was. Refused (after the source compiled, so that an error of the
// source comes first): an output that is the source file
// itself, an existing output that the process may not write, a symbolic link
// of another user in a sticky world-writable directory, another user's file
// in a sticky directory that this process may not replace.
//
// Where no temporary file can be created in the directory, or the output is
// not a regular file (a FIFO, a device), the file is written in place; then a
// failure removes a regular output file.
result compile_to_file(const source &src, const std::string &output_path, const options &opt = {});

// For programs that compile to files: makes every signal that would end the
// process (SIGINT, SIGTERM, SIGHUP, SIGPIPE, SIGUSR1, ... but not SIGKILL) and
// that is neither ignored nor handled already remove the temporary file of a
// compile in progress before it ends the process as it would have; ignores
// SIGXFSZ, so that a file size limit
// fails the compile with "Cannot extend CDB file: File too large" instead of
// killing the process.
void remove_temporary_files_on_signals();

} // namespace qecfg

#endif
