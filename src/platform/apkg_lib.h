// Add-on package library (stand-in). APKG_ReadAllXml reads
// /etc/NAS_CFG/apkg.xml (<root><item><name/><state/><path/></item>...</root>)
// into the list p_lib_list points at, in the library's own byte layout:
//   header, 16 bytes:   bytes 8..15 hold the first record's pointer (or null)
//   record, 1856 bytes: zero-filled; state int32 at 20 (strtol of <state>),
//                       name text at 216 (<= 203 chars), path text at 420
//                       (<= 1427 chars), next record's pointer at 1848.
// Longer texts are cut to fit. A missing or unreadable file gives a header
// whose first pointer is null.
#ifndef DAVSYNC_PLATFORM_APKG_LIB_H
#define DAVSYNC_PLATFORM_APKG_LIB_H

#include <cstddef>

constexpr size_t APKG_HEADER_SIZE = 16;
constexpr size_t APKG_HEADER_FIRST = 8;
constexpr size_t APKG_RECORD_SIZE = 1856;
constexpr size_t APKG_RECORD_STATE = 20;
constexpr size_t APKG_RECORD_NAME = 216;
constexpr size_t APKG_RECORD_PATH = 420;
constexpr size_t APKG_RECORD_NEXT = 1848;

extern "C" {
extern void *p_lib_list;
// 1 when a running process has exactly this command name (/proc/<pid>/comm).
int LIB_Check_ps(const char *name);
// Does nothing; 0.
int APKG_COMMAND(int command, int argument);
// Builds the list; 0, or -1 when memory is exhausted.
int APKG_ReadAllXml(void);
// Frees the list and sets p_lib_list to null.
void APKG_FreeAllXml(void);
}

#endif
