// The USB publishing marker ".davconf" as part of a run's change: do and
// merge mark a folder below /mnt/USB, del unmarks it. A marker is staged
// beside its place (".davconf.davsync", written and synced before the
// change is committed) and renamed in by the commit. The folder belongs to
// whoever plugged the volume in: a folder reached through a link, or
// something other than this user's regular file at the marker's name, is
// refused and told, never followed or replaced.
#ifndef DAVSYNC_SHARES_USB_MARKS_H
#define DAVSYNC_SHARES_USB_MARKS_H

#include "base/commit_record.h"
#include "base/diagnostics.h"

// Stages the mark (or the removal) of `folder`'s marker and adds its step to
// `changes`; a folder that is not there needs none. 0, also after a refusal;
// -1 with the failure noted.
int stage_usb_mark(ChangeSet *changes, const char *folder, bool mark, const char *command,
                   RunFailure *failure);
// Removes staged markers a killed run left in the USB volumes' root
// folders. Returns how many, -1 with the failure noted.
int discard_staged_marks(RunFailure *failure);

#endif
