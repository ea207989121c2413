// The host SDK's video: the OpenGL canvas that shows DVR channels, and the
// decoder thread that feeds it.
#ifndef HOST_SDK_VIDEO_H
#define HOST_SDK_VIDEO_H

#include <atomic>
#include <mutex>
#include <condition_variable>
#include <string>
#include <vector>

#include <wx/glcanvas.h>
#include <wx/image.h>
#include <wx/thread.h>

#include "host/picture.h"
#include "host/sdk_api.h"
#include "host/sdk_services.h"

class QRIX_SDK_API BasicGLPane : public wxGLCanvas {
public:
    // `context` is the shared context of the host's frame manager; a canvas
    // without one shows nothing.
    BasicGLPane(wxWindow* parent, int* attributes, wxGLContext* context, const wxPoint& pos, const wxSize& size);
    // Host side: the attributes of every canvas the host makes itself, the
    // same as a plugin's, so that the one shared context serves them all.
    static int* HostAttributes();

    void Init();
    void OnEraseBackground(wxEraseEvent& event);
    void OnRender(wxPaintEvent& event);
    // Operation 2: take the newest pictures and repaint.
    void ProcessTexture(int operation, _TEXTURE_DATA* texture);
    void Reset(int channel, int type);
    void SetOnAllChannels(unsigned long long address, int channelCount, int type);
    void SetOffAllChannels(unsigned long long address, int channelCount, int type);
    int getWidth();

    // Host side: a decoder hands the newest picture of a channel, from any
    // thread; the next ProcessTexture shows it.
    void ShowPicture(int channel, Picture picture);
    int PicturesReceived() const;
    Picture LastPicture() const;
    // The line shown over the picture (UTF-8), from any thread.
    void ShowCaption(const std::string& caption);
    std::string Caption() const;
    // What the canvas shows now: its scene drawn once more and read back
    // from OpenGL (empty when it cannot draw).
    wxImage Snapshot();

    // What the canvas was asked to do, for whoever watches the host.
    struct Call {
        enum Kind { kReset, kOn, kOff } kind;
        unsigned long long address;
        int count;
        int type;
    };
    const std::vector<Call>& Calls() const { return m_calls; }
    int TextureUpdates() const { return m_textureUpdates; }
    int Renders() const { return m_renders; }
    int ChannelsShown() const { return m_channelsShown; }

private:
    static constexpr int kMaxChannels = 32;
    void UploadNewestPictures();
    void UploadCaption();
    void DrawScene();
    void DrawCell(int channel, int columns);
    void DrawCaption();

    wxGLContext* m_context;
    mutable std::mutex m_pictureMutex;
    Picture m_newest[kMaxChannels];
    bool m_fresh[kMaxChannels] = {};
    int m_picturesReceived = 0;
    Picture m_last;
    unsigned int m_textures[kMaxChannels] = {};
    bool m_hasTexture[kMaxChannels] = {};
    wxSize m_pictureSize[kMaxChannels];
    std::string m_caption;
    bool m_captionFresh = false;
    unsigned int m_captionTexture = 0;
    wxSize m_captionSize;
    std::vector<Call> m_calls;
    int m_textureUpdates = 0;
    int m_renders = 0;
    int m_channelsShown = 0;
};

// A decoder thread for the channels of one DVR. It runs detached: Delete
// returns at once and the thread disposes of itself; StopDecoder, called
// before, waits until the thread touches nothing outside itself any more.
class QRIX_SDK_API ChannelDecoder : public wxThread {
public:
    explicit ChannelDecoder(wxEvtHandler* handler);
    ~ChannelDecoder() override;

    void SetCanvas(BasicGLPane* canvas);
    void SetConnectType(int type);
    void SetIpAndChannel(unsigned long long address, int channelCount);
    virtual void StopDecoder();

    long long m_dvrId;       // the DVR this decoder serves
    wxString* m_filePath;    // the file or disk it reads, for file and disk playback

protected:
    ExitCode Entry() override;

private:
    friend class DecoderLoop;
    // Waits on the decoder's lock for `milliseconds` or until woken; false
    // once the decoder is asked to stop or to end.
    bool Wait(std::unique_lock<std::mutex>& lock, int milliseconds);
    bool Stopping();
    void Publish(std::unique_lock<std::mutex>& lock, Picture picture);
    void PublishCaption(std::unique_lock<std::mutex>& lock, const std::string& caption);
    void IdleUntilDeleted(std::unique_lock<std::mutex>& lock);

    std::mutex m_mutex;
    std::condition_variable m_changed;
    BasicGLPane* m_canvas = nullptr;
    int m_connectType = 0;
    unsigned long long m_address = 0;
    int m_channelCount = 0;
    bool m_stopRequested = false;
    bool m_idle = false;  // the worker acknowledged the stop and touches nothing any more
    wxString m_filePathText;
};

#endif
