// What the host knows of each disk playback it answered: the disk, the
// recording, and the speed of the latest transport command. Shared between
// the GUI thread (events) and the decoder threads, so every access locks.
#ifndef HOST_PLAYBACK_CONTROL_H
#define HOST_PLAYBACK_CONTROL_H

#include <map>
#include <mutex>

#include <wx/string.h>

#include "host/sdk_api.h"

class QRIX_SDK_API PlaybackControl {
public:
    static constexpr int kNormalSpeed = 1024;

    struct Session {
        wxString path;   // the disk
        int record = 0;  // list index of the recording (its low 16 bits)
        int speed = kNormalSpeed;
        // Where playback stopped by itself: 1 after the newest frame of the
        // disk, -1 before its oldest, 0 while it can go on.
        int end = 0;
    };

    static PlaybackControl* Get();

    void Start(long long dvrId, const wxString& path, int record);
    // The speed of a transport command; playback goes on from where it is.
    void SetSpeed(long long dvrId, int speed);
    // Playback reached an end of the disk's recordings: the picture holds.
    void MarkEnd(long long dvrId, int end);
    // A copy of the session of a DVR; false when the host never answered it.
    bool Find(long long dvrId, Session* session) const;
    int Speed(long long dvrId) const;
    void Forget(long long dvrId);

private:
    PlaybackControl() = default;
    mutable std::mutex m_mutex;
    std::map<long long, Session> m_sessions;
};

class CatalogReader;
struct _HisiList_t;

// Opens the disk as a volume with `reader`, as the catalogue build opens it,
// and reads the list entry at position `record`, which must carry those low
// 16 bits as its index, as the playback events give it. False when the disk
// holds no such recording.
QRIX_SDK_API bool OpenRecording(CatalogReader& reader, const wxString& disk, int record, _HisiList_t* recording);

#endif
