// The host SDK's playback services: frame and sound processing, the shared
// OpenGL context, the registry of DVRs and the sound output.
#ifndef HOST_SDK_SERVICES_H
#define HOST_SDK_SERVICES_H

#include <cstddef>
#include <cstdint>
#include <vector>

#include "host/sdk_api.h"

class wxGLContext;

// One frame of a DVR channel as the host's frame manager handles it.
#pragma pack(push, 4)
struct QRIX_SDK_API _sDvrFrame {
    unsigned long long address;
    std::int32_t reserved8;
    long long panelId;
    std::uint8_t reserved20[20];
    std::int32_t channel;
    const unsigned char* data;
    std::int32_t size;
    std::int32_t frameType;
};
#pragma pack(pop)
static_assert(offsetof(_sDvrFrame, panelId) == 12, "frame record: panel identifier");
static_assert(offsetof(_sDvrFrame, channel) == 40, "frame record: channel");

// A decoded picture handed to a canvas; plugins only pass null.
struct _TEXTURE_DATA;

class QRIX_SDK_API FrameManager {
public:
    static FrameManager* Get();

    // Operation 1 hands out the shared OpenGL context (created on first use).
    wxGLContext* GLRCProcess(int operation, wxGLContext* context);
    // Operation 2 ends the processing of a channel's frames or sound.
    void RemoteProcess(int operation, unsigned long long address, int channel, long long panelId, _sDvrFrame* frame);
    void SoundProcess(int operation, unsigned long long address, int channel, long long panelId, _sDvrFrame* frame);

    struct Call {
        bool sound;
        int operation;
        unsigned long long address;
        int channel;
        long long panelId;
    };
    const std::vector<Call>& Calls() const { return m_calls; }
    void ClearCalls() { m_calls.clear(); }
    // Releases the shared context and its hidden window (at host exit).
    void Shutdown();

private:
    FrameManager() = default;
    std::vector<Call> m_calls;
    wxGLContext* m_context = nullptr;
    class wxFrame* m_contextFrame = nullptr;
};

// The host's record of a DVR it is connected to.
struct QRIX_SDK_API DvrRecord {
    unsigned int address;
    int channelCount;
    long long id;
};

class QRIX_SDK_API DvrManager {
public:
    static DvrManager* Get();
    const DvrRecord* GetDvrByIP(unsigned int address) const;
    void Register(unsigned int address, int channelCount, long long id);
    void Unregister(unsigned int address);

private:
    DvrManager() = default;
    std::vector<DvrRecord> m_dvrs;
};

class QRIX_SDK_API CSoundout {
public:
    static CSoundout* Get();
    // Routes a channel's sound to the output at the given volume step.
    void SetAudioCh(int channel, int volume);
    const std::vector<std::pair<int, int>>& Routes() const { return m_routes; }
    void ClearRoutes() { m_routes.clear(); }

private:
    CSoundout() = default;
    std::vector<std::pair<int, int>> m_routes;
};

#endif
