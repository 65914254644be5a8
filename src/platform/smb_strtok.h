// SMB interface library tokenizer (stand-in): the behaviour of strtok(3).
// A call with a text starts on it and cuts it in place; calls with null go
// on in the same text; runs of delimiters are skipped; null when no token
// is left. Keeps its position between calls.
#ifndef DAVSYNC_PLATFORM_SMB_STRTOK_H
#define DAVSYNC_PLATFORM_SMB_STRTOK_H

extern "C" char *smb_strtok(char *text, const char *delimiters);

#endif
