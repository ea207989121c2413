#include "host/playback_control.h"

#include "catalog/catalog_reader.h"

PlaybackControl* PlaybackControl::Get()
{
    static PlaybackControl* control = new PlaybackControl;
    return control;
}

void PlaybackControl::Start(long long dvrId, const wxString& path, int record)
{
    std::lock_guard<std::mutex> lock(m_mutex);
    Session& session = m_sessions[dvrId];
    session.path = path.Clone();  // the decoder thread reads it: no shared buffer
    session.record = record;
    session.speed = kNormalSpeed;
    session.end = 0;
}

void PlaybackControl::SetSpeed(long long dvrId, int speed)
{
    std::lock_guard<std::mutex> lock(m_mutex);
    auto it = m_sessions.find(dvrId);
    if (it != m_sessions.end()) {
        it->second.speed = speed;
        it->second.end = 0;
    }
}

void PlaybackControl::MarkEnd(long long dvrId, int end)
{
    std::lock_guard<std::mutex> lock(m_mutex);
    auto it = m_sessions.find(dvrId);
    if (it != m_sessions.end()) {
        it->second.speed = 0;
        it->second.end = end;
    }
}

bool PlaybackControl::Find(long long dvrId, Session* session) const
{
    std::lock_guard<std::mutex> lock(m_mutex);
    auto it = m_sessions.find(dvrId);
    if (it == m_sessions.end())
        return false;
    *session = it->second;
    session->path = it->second.path.Clone();
    return true;
}

int PlaybackControl::Speed(long long dvrId) const
{
    std::lock_guard<std::mutex> lock(m_mutex);
    auto it = m_sessions.find(dvrId);
    return it == m_sessions.end() ? kNormalSpeed : it->second.speed;
}

void PlaybackControl::Forget(long long dvrId)
{
    std::lock_guard<std::mutex> lock(m_mutex);
    m_sessions.erase(dvrId);
}

bool OpenRecording(CatalogReader& reader, const wxString& disk, int record, _HisiList_t* recording)
{
    if (!reader.OpenVolume(std::string(disk.fn_str())).Ready())
        return false;
    const int ringSize = reader.Adapter()->ListMax;
    return ringSize > 0 && record >= 0 &&
           reader.ReadListEntries(record % ringSize, 1, reinterpret_cast<char*>(recording)) > 0 &&
           (recording->Idx & 0xFFFF) == record;
}
