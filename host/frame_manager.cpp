// The host's frame manager (shared OpenGL context, frame and sound
// processing), its registry of DVRs and its sound output.
#include <algorithm>

#include <wx/frame.h>
#include <wx/glcanvas.h>

#include "host/sdk_services.h"
#include "host/sdk_video.h"

FrameManager* FrameManager::Get()
{
    static FrameManager* manager = new FrameManager;
    return manager;
}

wxGLContext* FrameManager::GLRCProcess(int operation, wxGLContext*)
{
    if (operation != 1)
        return nullptr;
    if (!m_context) {
        // The context is made on a canvas of a window that is never shown.
        m_contextFrame = new wxFrame(nullptr, wxID_ANY, "shared OpenGL context");
        auto* canvas = new wxGLCanvas(m_contextFrame, wxID_ANY, BasicGLPane::HostAttributes());
        m_context = new wxGLContext(canvas);
    }
    return m_context;
}

void FrameManager::RemoteProcess(int operation, unsigned long long address, int channel, long long panelId,
                                 _sDvrFrame*)
{
    m_calls.push_back({false, operation, address, channel, panelId});
}

void FrameManager::SoundProcess(int operation, unsigned long long address, int channel, long long panelId,
                                _sDvrFrame*)
{
    m_calls.push_back({true, operation, address, channel, panelId});
}

void FrameManager::Shutdown()
{
    delete m_context;
    m_context = nullptr;
    if (m_contextFrame)
        m_contextFrame->Destroy();
    m_contextFrame = nullptr;
}

DvrManager* DvrManager::Get()
{
    static DvrManager* manager = new DvrManager;
    return manager;
}

const DvrRecord* DvrManager::GetDvrByIP(unsigned int address) const
{
    auto it = std::find_if(m_dvrs.begin(), m_dvrs.end(), [address](const DvrRecord& d) { return d.address == address; });
    return it == m_dvrs.end() ? nullptr : &*it;
}

void DvrManager::Register(unsigned int address, int channelCount, long long id)
{
    Unregister(address);
    m_dvrs.push_back({address, channelCount, id});
}

void DvrManager::Unregister(unsigned int address)
{
    m_dvrs.erase(std::remove_if(m_dvrs.begin(), m_dvrs.end(), [address](const DvrRecord& d) { return d.address == address; }),
                 m_dvrs.end());
}

CSoundout* CSoundout::Get()
{
    static CSoundout* sound = new CSoundout;
    return sound;
}

void CSoundout::SetAudioCh(int channel, int volume)
{
    m_routes.emplace_back(channel, volume);
}
