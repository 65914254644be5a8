// The start command (the cycle with no change of its own) and the stop
// command (the cycle with WebDAV off: every entry's section says "Dav Off"
// and is not linked, marked USB volumes stay on, and the server is
// stopped). 0, or -1 after the failure exit.
#ifndef DAVSYNC_CYCLE_START_STOP_H
#define DAVSYNC_CYCLE_START_STOP_H

int webdav_start();
int webdav_stop();

#endif
