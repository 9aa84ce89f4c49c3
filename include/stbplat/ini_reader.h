// INIReader: reads an ini file of [sections] and name = value lines and hands
// each pair to the caller's handler; it keeps no table of its own.
//
// Syntax: ';' or '#' starts a comment line; an inline comment is a ';' right
// after whitespace ("a = b ; note" gives "b", "a = b;c" gives "b;c"); '='
// separates name and value, or ':' when there is no '='; a line starting with
// ':' is a directive for the directive handler. Section names keep inner
// spaces and hold at most 49 characters. A physical line longer than 4999
// characters is read in pieces, each counted as a line and parsed as a line
// of its own: text past character 4999 can become a setting of its own. A
// UTF-8 byte-order mark before the first line is skipped.
#ifndef STBPLAT_INI_READER_H
#define STBPLAT_INI_READER_H

#include "stbplat/export.h"

class STBPLAT_EXPORT INIReader {
 public:
  typedef bool (*ValueHandler)(void* user, const char* section, const char* name,
                               const char* value);
  typedef bool (*DirectiveHandler)(void* user, const char* line);

  // Copy of the name given to the constructor; null when none was given.
  char* fileName;
  // Called for every name/value line; a false result marks the line bad.
  ValueHandler valueHandler;
  // Called for lines that start with ':' (the ':' included). Null unless set
  // with SetDirectiveHandler; while null, such lines are skipped.
  DirectiveHandler directiveHandler;
  // First argument of both handlers.
  void* user;
  // 5000 bytes, made only when a file name was given.
  char* lineBuffer;

  // A null fileName prints "File name not specified to INIReader" and
  // allocates nothing; Parse then fails.
  INIReader(const char* fileName, ValueHandler handler, void* user);
  virtual ~INIReader();
  INIReader(const INIReader&) = delete;
  INIReader& operator=(const INIReader&) = delete;

  // -1 when the file cannot be opened or a read fails (a directory, an I/O
  // error part-way: what was parsed before still reached the handler), 0
  // when every line was good, else the
  // number (from 1) of the first bad line; a line with no '=' or ':' is the
  // exception: it becomes the error line even after an earlier bad line.
  // Bad lines are reported on standard output and do not stop the parse.
  int Parse();

  void SetDirectiveHandler(DirectiveHandler handler);

  // Overwrites trailing whitespace with 0; returns s.
  char* StripWhitespacesAtEnd(char* s);
  // First non-whitespace character of s, or its terminator.
  char* FindFirstNonWhitespace(const char* s);
  // First c, or first ';' right after whitespace, or the terminator.
  char* FindCharOrComment(const char* s, char c);
  // strncpy of size bytes, always terminated within them (size 0 writes
  // nothing); returns dst.
  char* strncpy0(char* dst, const char* src, unsigned long size);
};

#endif
