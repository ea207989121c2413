#include "qrixhost/disk_playback_service.h"

#include "catalog/catalog_reader.h"
#include "host/playback_control.h"
#include "qrixhost/file_player.h"

namespace {

// The disk and recording of the last connect, for the file player.
wxString g_lastDisk;
int g_lastRecord = -1;

// Whether the disk holds a recording at list position `record`.
bool DiskHoldsRecording(const wxString& disk, int record)
{
    CatalogReader reader;
    _HisiList_t recording{};
    return OpenRecording(reader, disk, record, &recording);
}

}  // namespace

void AnswerDiskPlayback(QrixFileEvent& event)
{
    if (event.GetEventType() == iEVT_HDD_CONNECTED) {
        event.channelCount = 0;
        if (!DiskHoldsRecording(event.path, event.record))
            return;
        unsigned int address = 0;
        StringIPtoUint32(event.address, address);
        DvrManager::Get()->Register(address, 1, event.panelId);
        PlaybackControl::Get()->Start(event.panelId, event.path, event.record);
        g_lastDisk = event.path;
        g_lastRecord = event.record;
        event.channelCount = 1;
    } else if (event.GetEventType() == iEVT_HDD_COMMAND) {
        PlaybackControl::Get()->SetSpeed(event.panelId, event.command);
    }
}

void AnswerHostCommand(QrixEvent& event)
{
    if (event.GetEventType() == QRIX_START_FILEPLAY && g_lastRecord >= 0)
        new FilePlayer(g_lastDisk, g_lastRecord);
}

void InstallDiskPlaybackService()
{
    EventManager::Get()->SetFileEventHandler(AnswerDiskPlayback);
    EventManager::Get()->SetQrixEventHandler(AnswerHostCommand);
}
