// The host's file player: a window of its own that plays a recording of a
// disk, as the plugin's switch to file play asks for.
#ifndef QRIXHOST_FILE_PLAYER_H
#define QRIXHOST_FILE_PLAYER_H

#include <wx/button.h>
#include <wx/frame.h>
#include <wx/timer.h>

#include "host/qrix_sdk.h"

class FilePlayer : public wxFrame {
public:
    FilePlayer(const wxString& disk, int record);
    ~FilePlayer() override;

    BasicGLPane* canvas() const { return m_canvas; }
    wxButton* playPause() const { return m_playPause; }
    // Closes every file player now (the host is ending: the shared OpenGL
    // context goes next).
    static void CloseAll();

private:
    void OnTick(wxTimerEvent& event);
    void OnClose(wxCloseEvent& event);
    void OnPlayPause(wxCommandEvent& event);
    void StopDecoder();

    long long m_id;
    BasicGLPane* m_canvas;
    wxButton* m_playPause;
    ChannelDecoder* m_decoder = nullptr;
    wxTimer m_tick;
};

#endif
