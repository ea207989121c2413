#include "host/playback_control.h"

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
}

void PlaybackControl::SetSpeed(long long dvrId, int speed)
{
    std::lock_guard<std::mutex> lock(m_mutex);
    auto it = m_sessions.find(dvrId);
    if (it != m_sessions.end())
        it->second.speed = speed;
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
