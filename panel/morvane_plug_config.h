// The playback panel: the window in which the user picks an attached disk,
// sees the recordings on it and plays them. It is also the disk reader and
// the catalogue (its CatalogReader base) and the playback state.
//
// The panel object itself is never a native window: what the user sees is
// the dialog it creates, and every widget is a child of that dialog.
#ifndef PANEL_MORVANE_PLUG_CONFIG_H
#define PANEL_MORVANE_PLUG_CONFIG_H

#include <cstdint>

#include <wx/bmpbuttn.h>
#include <wx/dialog.h>
#include <wx/stattext.h>

#include "catalog/catalog_reader.h"
#include "host/qrix_sdk.h"

class MorvanePlugin;
class CPlugListCtrl;
class CPlugComboCtrl;

class MorvanePlugConfig : public ConfigurationPanel, public CatalogReader {
public:
    MorvanePlugConfig(wxWindow* parent, MorvanePlugin* plugin, wxGLContext* context);
    ~MorvanePlugConfig() override;

    wxString GetTitle() const override;
    wxString GetBitmapBaseName() const override;
    void OnApply() override;
    void OnCancel() override;

    // Layout, painting, close.
    void OnSize(wxSizeEvent& event);
    void OnPaint(wxPaintEvent& event);
    void OnEraseBackground(wxEraseEvent& event);
    void OnCloseWindow(wxCloseEvent& event);

    // Drives and recordings.
    void SetDriverTrees();
    void SendHddList(int drive);
    void Setwxlist();

    // Playback and transport.
    void SendMorvaneCommand(int index);
    void OnPlayVideo(wxCommandEvent& event);
    void OnPauseVideo(wxCommandEvent& event);
    void OnStopVideo(wxCommandEvent& event);
    void OnBackVideo(wxCommandEvent& event);
    void OnForwardVideo(wxCommandEvent& event);
    void OnSwitchToFilePlay(wxCommandEvent& event);

    // Fields in the panel's order; those of the disk reader and the
    // catalogue (m_recordCount, the catalogue, the volume, the error
    // register, the stream cursor, the disk's source) live in the
    // CatalogReader base.
    MorvanePlugin* m_plugin;
    wxGLContext* m_glContext;
    ChannelDecoder* m_decoder;
    wxDialog* m_dialog;
    BasicGLPane* m_glPane;
    wxStaticText* m_driveLabel;
    CPlugListCtrl* m_recordList;
    CPlugComboCtrl* m_driveCombo;
    std::int32_t m_reverseStep;
    std::int32_t m_forwardStep;
    std::int32_t m_channelCount;
    std::int32_t m_playState;  // 0 playing, 1 paused, 2 stopped, 3 fast forward, 4 fast reverse
    wxSize m_buttonSize;
    long long m_panelId;
    wxString m_connText1;
    wxString m_connText2;
    wxString m_connAddress;
    std::uint16_t m_connRecord;
    wxString m_connPath;
    wxString m_diskPath;
    std::int32_t m_currentRecord;
    wxBitmapButton* m_btnPlay;
    wxBitmapButton* m_btnPause;
    wxBitmapButton* m_btnStop;
    wxBitmapButton* m_btnReverse;
    wxBitmapButton* m_btnForward;
    wxBitmapButton* m_btnSwitch;
    // One line under the transport buttons: what the chosen drive holds, or
    // why it could not be read.
    wxStaticText* m_statusLine;

private:
    wxBitmapButton* MakeButton(int id, const wxString& image, const wxPoint& pos);
    void ConnectHandlers();
    void PlaceButtonRow(int y, int base);
    void ShowBuildSummary(int drive);

    // Playback shutdown shared by close and destruction; returns the address
    // of the connection record (0 when nothing played).
    unsigned int StopPlayback();
    // Sends a disconnect of the current connection, stops and forgets the
    // decoder.
    void TakeDownDecoder(int eventId);
    // Detaches the decoder from the canvas, stops it and lets it go; a decoder
    // that ended by itself is only forgotten.
    void ReleaseDecoder();
    void DeleteCanvas();
    void SendFileEvent(int type, int id, int mode, int command);
    // Sends a host command without data (close all, start file play).
    void SendHostCommand(int type);
    // The connection record and the panel identifier, as every event about
    // the current playback carries them.
    template <class Event>
    void FillFromConnection(Event& event) const
    {
        event.text1 = m_connText1;
        event.text2 = m_connText2;
        event.address = m_connAddress;
        event.record = m_connRecord;
        event.path = m_connPath;
        event.channelCount = 0;
        event.panelId = m_panelId;
    }

    wxDECLARE_EVENT_TABLE();
};

#endif
