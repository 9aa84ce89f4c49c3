// Line-oriented ini parsing shared by INIReader and the platform's memory-map
// loader. The core never opens a file, never logs and uses no OS seam: the
// caller hands it a line source (usually fgets over a FILE*), so it can be
// compiled into both libraries. Every symbol here is internal (hidden).
//
// Syntax, one physical line at a time (a line longer than the buffer arrives
// in pieces, each counted as a line and parsed on its own); a UTF-8
// byte-order mark at the start of the first line is skipped:
//   ; comment   # comment        whole-line comments
//   [section]                    section name kept verbatim, at most 49 chars
//   name = value ; note          '=' or, failing that, ':' separates
//   :directive text              handed to the directive handler, ':' included
// An inline comment is a ';' directly after a whitespace character.
// Bad lines do not stop the parse. The result is the number (from 1) of the
// first bad line, except that a line with no separator always becomes the
// error line, even after an earlier one. Messages go to standard output.
#ifndef STBPLAT_SRC_UTIL_INI_CORE_H
#define STBPLAT_SRC_UTIL_INI_CORE_H

#include <cstdio>

namespace stbplat {
namespace ini {

// A physical line is read into a buffer of this size (4999 characters + 0).
constexpr int kLineBufferSize = 5000;
// Section names and the last-name copy hold 49 characters + 0.
constexpr unsigned long kNameBufferSize = 50;

// Fills `buffer` (at most size - 1 characters, terminated) with the next line
// and returns `buffer`, or returns null at the end. fgets has this shape.
using LineSource = char* (*)(char* buffer, int size, void* context);
using FileLineReader = char* (*)(char* buffer, int size, FILE* file);

// Returns false to mark the line as bad; the parse goes on.
using ValueHandler = bool (*)(void* user, const char* section, const char* name,
                              const char* value);
using DirectiveHandler = bool (*)(void* user, const char* line);

// Overwrites trailing isspace characters with 0; returns s.
char* StripWhitespacesAtEnd(char* s);
// First character of s that is not isspace, or its terminator.
char* FindFirstNonWhitespace(const char* s);
// First c, or first ';' directly after a whitespace character, or the
// terminator, whichever comes first. A ';' at the start of s is plain text.
char* FindCharOrComment(const char* s, char c);
// strncpy of size bytes, then dst[size - 1] = 0; returns dst. Size 0 writes
// nothing.
char* strncpy0(char* dst, const char* src, unsigned long size);

// Parses lines from nextLine(buffer, bufferSize, context) until it returns
// null, calling valueHandler(user, section, name, value) for every name/value
// line and directiveHandler(user, line) for every line starting with ':'.
// Name and value point into `lineBuffer`; they are valid during the call only.
// fileNameForMessages is only printed (null prints as "(null)").
// Returns 0 when every line was good, else the number of the error line.
// A null handler is never called: its lines are accepted and skipped. A null
// line source, a null buffer or a bufferSize below 2 parse nothing (0).
int ParseLines(LineSource nextLine, void* context, ValueHandler valueHandler,
               DirectiveHandler directiveHandler, void* user, const char* fileNameForMessages,
               char* lineBuffer, int bufferSize);

// ParseLines with a kLineBufferSize buffer of its own.
int IniParse(LineSource nextLine, void* context, ValueHandler valueHandler,
             DirectiveHandler directiveHandler, void* user, const char* fileNameForMessages);

// IniParse over an open file, read with readLine (fgets or the caller's
// wrapper of it). The caller opens and closes the file.
int IniParseFile(FILE* file, FileLineReader readLine, ValueHandler valueHandler,
                 DirectiveHandler directiveHandler, void* user, const char* fileNameForMessages);

}  // namespace ini
}  // namespace stbplat

#endif
