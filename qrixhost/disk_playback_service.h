// The host's side of disk playback: its answers to the plugin's connect,
// command and disconnect events, and the file player it opens on request.
#ifndef QRIXHOST_DISK_PLAYBACK_SERVICE_H
#define QRIXHOST_DISK_PLAYBACK_SERVICE_H

#include "host/qrix_sdk.h"

// A connect is answered after a look at the disk: one channel when the
// recording is there (the pseudo DVR is registered at the connection's
// address), none when not. Commands set the speed of the playback.
void AnswerDiskPlayback(QrixFileEvent& event);
// Opens the file player on the recording the last connect named.
void AnswerHostCommand(QrixEvent& event);
void InstallDiskPlaybackService();

#endif
