#include "qrixhost/file_player.h"

#include "host/playback_control.h"

#include <wx/sizer.h>

#include <set>

namespace {

std::set<FilePlayer*> g_players;
}  // namespace

FilePlayer::FilePlayer(const wxString& disk, int record)
    : wxFrame(nullptr, wxID_ANY, wxString::Format("File player - %s, recording %d", disk, record), wxDefaultPosition,
              wxSize(660, 520)),
      m_id(getCPUTickCount()),
      m_tick(this)
{
    m_canvas = new BasicGLPane(this, BasicGLPane::HostAttributes(), FrameManager::Get()->GLRCProcess(1, nullptr),
                               wxDefaultPosition, wxDefaultSize);
    m_canvas->Init();
    m_playPause = new wxButton(this, wxID_ANY, "Pause");
    auto* layout = new wxBoxSizer(wxVERTICAL);
    layout->Add(m_canvas, 1, wxEXPAND);
    layout->Add(m_playPause, 0, wxALL, 4);
    SetSizer(layout);
    m_playPause->Bind(wxEVT_BUTTON, &FilePlayer::OnPlayPause, this);
    m_canvas->SetOnAllChannels(0, 1, 3);
    PlaybackControl::Get()->Start(m_id, disk, record);
    m_decoder = new ChannelDecoder(nullptr);
    m_decoder->m_dvrId = m_id;
    *m_decoder->m_filePath = disk;
    m_decoder->SetCanvas(m_canvas);
    m_decoder->SetIpAndChannel(0, 1);
    if (m_decoder->Create() != wxTHREAD_NO_ERROR || m_decoder->Run() != wxTHREAD_NO_ERROR)
        m_decoder = nullptr;  // a thread that never ran disposes of itself
    Bind(wxEVT_TIMER, &FilePlayer::OnTick, this);
    Bind(wxEVT_CLOSE_WINDOW, &FilePlayer::OnClose, this);
    m_tick.Start(40);
    g_players.insert(this);
    Show();
}

FilePlayer::~FilePlayer()
{
    StopDecoder();
    g_players.erase(this);
}

void FilePlayer::CloseAll()
{
    const std::set<FilePlayer*> players = g_players;
    for (FilePlayer* player : players) {
        player->StopDecoder();
        player->Destroy();
    }
}

void FilePlayer::StopDecoder()
{
    m_tick.Stop();
    if (m_decoder) {
        m_decoder->SetCanvas(nullptr);
        m_decoder->StopDecoder();
        m_decoder->Delete(nullptr);
        m_decoder = nullptr;
    }
    PlaybackControl::Get()->Forget(m_id);
}

void FilePlayer::OnTick(wxTimerEvent&)
{
    m_canvas->ProcessTexture(2, nullptr);
}

// Pause holds the picture; Play goes on at normal speed from it.
void FilePlayer::OnPlayPause(wxCommandEvent&)
{
    const bool playing = PlaybackControl::Get()->Speed(m_id) != 0;
    PlaybackControl::Get()->SetSpeed(m_id, playing ? 0 : PlaybackControl::kNormalSpeed);
    m_playPause->SetLabel(playing ? "Play" : "Pause");
}

void FilePlayer::OnClose(wxCloseEvent& event)
{
    StopDecoder();
    event.Skip();
}
