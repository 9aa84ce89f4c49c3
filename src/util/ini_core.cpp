#include "util/ini_core.h"

#include <cctype>
#include <cstring>

namespace stbplat {
namespace ini {
namespace {

constexpr char kCommentChar = ';';
constexpr char kHashComment = '#';
constexpr char kDirectiveChar = ':';
constexpr char kSectionOpen = '[';
constexpr char kSectionClose = ']';
constexpr char kSeparator = '=';
constexpr char kSecondSeparator = ':';
// Editors on other systems start a UTF-8 file with a byte-order mark.
constexpr char kUtf8Bom[] = "\xEF\xBB\xBF";
constexpr size_t kUtf8BomLength = sizeof kUtf8Bom - 1;

bool IsSpace(char c) { return std::isspace(static_cast<unsigned char>(c)) != 0; }

const char* Printable(const char* s) { return s != nullptr ? s : "(null)"; }

struct FileSource {
  FILE* file;
  FileLineReader readLine;
};

char* ReadFromFile(char* buffer, int size, void* context) {
  FileSource* source = static_cast<FileSource*>(context);
  return source->readLine(buffer, size, source->file);
}

}  // namespace

char* StripWhitespacesAtEnd(char* s) {
  char* p = s + std::strlen(s);
  while (p > s && IsSpace(*--p)) *p = '\0';
  return s;
}

char* FindFirstNonWhitespace(const char* s) {
  while (*s != '\0' && IsSpace(*s)) ++s;
  return const_cast<char*>(s);
}

char* FindCharOrComment(const char* s, char c) {
  bool afterSpace = false;
  while (*s != '\0' && *s != c && !(afterSpace && *s == kCommentChar)) {
    afterSpace = IsSpace(*s);
    ++s;
  }
  return const_cast<char*>(s);
}

char* strncpy0(char* dst, const char* src, unsigned long size) {
  if (size == 0) return dst;  // no room even for the terminator
  std::strncpy(dst, src, size);
  dst[size - 1] = '\0';
  return dst;
}

int ParseLines(LineSource nextLine, void* context, ValueHandler valueHandler,
               DirectiveHandler directiveHandler, void* user, const char* fileNameForMessages,
               char* lineBuffer, int bufferSize) {
  if (nextLine == nullptr || lineBuffer == nullptr || bufferSize < 2) return 0;
  const char* fileName = Printable(fileNameForMessages);
  char section[kNameBufferSize] = "";
  // Kept like the section, though no caller receives it.
  char lastName[kNameBufferSize] = "";
  int errorLine = 0;
  int lineNumber = 0;

  while (nextLine(lineBuffer, bufferSize, context) != nullptr) {
    ++lineNumber;
    char* line = lineBuffer;
    if (lineNumber == 1 && std::strncmp(line, kUtf8Bom, kUtf8BomLength) == 0)
      line += kUtf8BomLength;
    char* p = FindFirstNonWhitespace(StripWhitespacesAtEnd(line));

    if (*p == kCommentChar || *p == kHashComment || *p == '\0') continue;

    if (*p == kDirectiveChar) {
      if (directiveHandler != nullptr && !directiveHandler(user, p) && errorLine == 0)
        errorLine = lineNumber;
      continue;
    }

    if (*p == kSectionOpen) {
      char* end = FindCharOrComment(p + 1, kSectionClose);
      if (*end == kSectionClose) {
        *end = '\0';
        strncpy0(section, p + 1, sizeof section);
        lastName[0] = '\0';
      } else if (errorLine == 0) {
        errorLine = lineNumber;
        std::printf("ERROR: No closing ']' found on line %d in file %s: %s\r\n", lineNumber,
                    fileName, p);
      }
      continue;
    }

    char* end = FindCharOrComment(p, kSeparator);
    if (*end != kSeparator) end = FindCharOrComment(p, kSecondSeparator);
    if (*end != kSeparator && *end != kSecondSeparator) {
      // The one error that replaces an earlier error line.
      errorLine = lineNumber;
      std::printf("ERROR: No value found on line %d in file %s for parameter %s\r\n", lineNumber,
                  fileName, p);
      continue;
    }
    *end = '\0';
    char* name = StripWhitespacesAtEnd(p);
    char* value = FindFirstNonWhitespace(end + 1);
    *FindCharOrComment(value, '\0') = '\0';
    StripWhitespacesAtEnd(value);
    strncpy0(lastName, name, sizeof lastName);
    if (valueHandler != nullptr && !valueHandler(user, section, name, value) && errorLine == 0)
      errorLine = lineNumber;
  }
  return errorLine;
}

int IniParse(LineSource nextLine, void* context, ValueHandler valueHandler,
             DirectiveHandler directiveHandler, void* user, const char* fileNameForMessages) {
  char buffer[kLineBufferSize];
  return ParseLines(nextLine, context, valueHandler, directiveHandler, user, fileNameForMessages,
                    buffer, kLineBufferSize);
}

int IniParseFile(FILE* file, FileLineReader readLine, ValueHandler valueHandler,
                 DirectiveHandler directiveHandler, void* user, const char* fileNameForMessages) {
  if (file == nullptr || readLine == nullptr) return 0;
  FileSource source{file, readLine};
  return IniParse(ReadFromFile, &source, valueHandler, directiveHandler, user,
                  fileNameForMessages);
}

}  // namespace ini
}  // namespace stbplat
