// The path given to the last file-opening stream constructor: the caller's
// pointer itself, never copied or cleared; shared by all streams.
#ifndef STBPLAT_SRC_STREAMS_LAST_FILE_NAME_H
#define STBPLAT_SRC_STREAMS_LAST_FILE_NAME_H

extern const char* pLastFileName;

#endif
