// Construction of the panel's dialog and widgets, and its layout.
#include <algorithm>

#include <wx/image.h>
#include <wx/log.h>
#include <wx/stdpaths.h>

#include "controls/plug_combo_ctrl.h"
#include "controls/plug_list_ctrl.h"
#include "panel/morvane_plug_config.h"

namespace {

constexpr long kDialogStyle = wxCAPTION | wxCLOSE_BOX | wxSYSTEM_MENU | wxMINIMIZE_BOX | wxMAXIMIZE_BOX;  // 0x20001E00
constexpr long kListStyle = wxLC_REPORT | wxSUNKEN_BORDER;                                            // 0x8000020
constexpr int kFixedLayoutHeight = 600;

int kCanvasAttributes[20] = {WX_GL_RGBA, WX_GL_MIN_RED, 1, WX_GL_MIN_GREEN, 1, WX_GL_MIN_BLUE, 1,
                             WX_GL_DEPTH_SIZE, 1, WX_GL_DOUBLEBUFFER, 0};

wxString Translated(const char* text)
{
    return wxLanguageEngine::Get()->Translation(text);
}

// An image of the host's data directory, or an empty bitmap when it cannot
// be read (nothing is reported: the button is still made).
wxBitmap LoadImage(const wxString& name)
{
    wxLogNull quiet;
    wxImage image;
    image.LoadFile(wxStandardPaths::Get().GetDataDir() + name, wxBITMAP_TYPE_ANY, -1);
    return image.IsOk() ? wxBitmap(image, -1) : wxBitmap();
}

}  // namespace

wxBEGIN_EVENT_TABLE(MorvanePlugConfig, ConfigurationPanel)
wxEND_EVENT_TABLE()

MorvanePlugConfig::MorvanePlugConfig(wxWindow* parent, MorvanePlugin* plugin, wxGLContext* context)
    : m_plugin(plugin),
      m_glContext(context),
      m_decoder(nullptr),
      m_dialog(nullptr),
      m_glPane(nullptr),
      m_driveLabel(nullptr),
      m_recordList(nullptr),
      m_driveCombo(nullptr),
      m_reverseStep(0),
      m_forwardStep(0),
      m_channelCount(0),
      m_playState(2),
      m_buttonSize(30, 30),
      m_panelId(getCPUTickCount()),
      m_connRecord(0),
      m_currentRecord(-1),
      m_btnPlay(nullptr),
      m_btnPause(nullptr),
      m_btnStop(nullptr),
      m_btnReverse(nullptr),
      m_btnForward(nullptr),
      m_btnSwitch(nullptr),
      m_statusLine(nullptr)
{
    m_dialog = new wxDialog(parent, wxID_ANY, Translated("Morvane"), wxDefaultPosition, wxSize(800, 600), kDialogStyle);
    m_dialog->SetBackgroundColour(wxColour(80, 58, 77, 255));
    m_dialog->Show();

    m_driveLabel = new wxStaticText(m_dialog, 1010, Translated("Select Dvr"), wxPoint(75, 4), wxDefaultSize, 0,
                                    "WxStaticText1");
    m_driveLabel->SetForegroundColour(wxColour(240, 240, 240, 255));

    m_driveCombo = new CPlugComboCtrl(m_dialog, 1011, wxString(), wxPoint(10, 30), wxSize(180, -1), 0);
    m_driveCombo->SetparentInstance(this);
    m_driveCombo->SetControlRes();

    m_recordList = new CPlugListCtrl(m_dialog, 1012, wxPoint(10, 70), wxSize(180, 490), kListStyle);
    m_recordList->SetparentInstance(this);
    m_recordList->InsertColumn(0, Translated("No."));
    m_recordList->SetColumnWidth(0, 40);
    m_recordList->InsertColumn(1, Translated("Start Time"), wxLIST_FORMAT_LEFT);
    m_recordList->SetColumnWidth(1, 150);
    m_recordList->InsertColumn(2, Translated("End Time"), wxLIST_FORMAT_LEFT);
    m_recordList->SetColumnWidth(2, 150);

    m_glPane = new BasicGLPane(m_dialog, kCanvasAttributes, m_glContext, wxPoint(200, 10), wxSize(585, 500));
    m_glPane->Init();

    wxInitAllImageHandlers();
    m_buttonSize = wxSize(30, 30);
    m_btnPlay = MakeButton(1028, "play", wxPoint(395, 530));
    m_btnPause = MakeButton(1029, "pause", wxPoint(435, 530));
    m_btnStop = MakeButton(1030, "stop", wxPoint(475, 530));
    m_btnReverse = MakeButton(1031, "reverse", wxPoint(515, 530));
    m_btnForward = MakeButton(1032, "forward", wxPoint(555, 530));
    m_btnSwitch = MakeButton(1033, "sw", wxPoint(750, 530));
    m_statusLine = new wxStaticText(m_dialog, wxID_ANY, wxString(), wxPoint(10, 564), wxSize(775, 34),
                                    wxST_NO_AUTORESIZE);
    m_statusLine->SetForegroundColour(wxColour(240, 240, 240, 255));

    SetDriverTrees();
    ConnectHandlers();

    // Keep the dialog where it is, and let the toolkit lay it out once more.
    const wxPoint where = m_dialog->GetPosition();
    m_dialog->SetSize(where.x, where.y, -1, -1, 0);
}

wxBitmapButton* MorvanePlugConfig::MakeButton(int id, const wxString& image, const wxPoint& pos)
{
    const wxBitmap normal = LoadImage("/plugimages/" + image + "_up.png");
    const wxBitmap pressed = LoadImage("/plugimages/" + image + "_dn.png");
    auto* button = new wxBitmapButton(m_dialog, id, normal, pos, m_buttonSize, wxBORDER_NONE);
    button->SetBitmapPressed(pressed);
    return button;
}

void MorvanePlugConfig::ConnectHandlers()
{
    const std::pair<wxBitmapButton*, wxObjectEventFunction> buttons[] = {
        {m_btnPlay, wxCommandEventHandler(MorvanePlugConfig::OnPlayVideo)},
        {m_btnPause, wxCommandEventHandler(MorvanePlugConfig::OnPauseVideo)},
        {m_btnStop, wxCommandEventHandler(MorvanePlugConfig::OnStopVideo)},
        {m_btnReverse, wxCommandEventHandler(MorvanePlugConfig::OnBackVideo)},
        {m_btnForward, wxCommandEventHandler(MorvanePlugConfig::OnForwardVideo)},
        {m_btnSwitch, wxCommandEventHandler(MorvanePlugConfig::OnSwitchToFilePlay)},
    };
    for (const auto& [button, handler] : buttons)
        button->Connect(wxID_ANY, wxID_ANY, wxEVT_BUTTON, handler, nullptr, this);
    m_dialog->Connect(wxID_ANY, wxID_ANY, wxEVT_SIZE, wxSizeEventHandler(MorvanePlugConfig::OnSize), nullptr, this);
    m_dialog->Connect(wxID_ANY, wxID_ANY, wxEVT_CLOSE_WINDOW, wxCloseEventHandler(MorvanePlugConfig::OnCloseWindow),
                      nullptr, this);
    m_glPane->Connect(wxID_ANY, wxID_ANY, wxEVT_PAINT, wxPaintEventHandler(MorvanePlugConfig::OnPaint), nullptr, this);
}

wxString MorvanePlugConfig::GetTitle() const
{
    return wxGetTranslation("MorvanePlugin");
}

wxString MorvanePlugConfig::GetBitmapBaseName() const
{
    return "MorvanePlugin";
}

void MorvanePlugConfig::OnApply() {}

void MorvanePlugConfig::OnCancel() {}

// Up to 600 pixels high the layout is fixed; above, the list and the canvas
// grow with the dialog and the button row follows the canvas. Every size is
// kept at least 1, so that a very narrow dialog still has a canvas. The
// switch button never moves.
void MorvanePlugConfig::OnSize(wxSizeEvent& event)
{
    const int width = event.GetSize().x;
    const int height = event.GetSize().y;
    if (height <= kFixedLayoutHeight) {
        m_recordList->SetSize(10, 70, 180, 490, wxSIZE_AUTO);
        if (m_glPane)
            m_glPane->SetSize(200, 10, 585, 500, wxSIZE_AUTO);
        int x = 395;
        for (wxBitmapButton* button : {m_btnPlay, m_btnPause, m_btnStop, m_btnReverse, m_btnForward}) {
            button->SetSize(x, 530, m_buttonSize.x, m_buttonSize.y, wxSIZE_AUTO);
            x += 40;
        }
        m_statusLine->SetSize(10, 564, 775, 34, wxSIZE_AUTO);
        return;
    }
    m_recordList->SetSize(10, 70, 180, std::max(height - 110, 1), wxSIZE_AUTO);
    if (m_glPane)
        m_glPane->SetSize(200, 10, std::max(width - 215, 1), std::max(height - 100, 1), wxSIZE_AUTO);
    PlaceButtonRow(height - 70, (6 * width) / 16);
    m_statusLine->SetSize(10, height - 36, std::max(width - 25, 1), 34, wxSIZE_AUTO);
}

void MorvanePlugConfig::PlaceButtonRow(int y, int base)
{
    // Eighths and thirty-seconds of the canvas's width, read afresh for each.
    const std::pair<wxBitmapButton*, int (*)(int)> row[] = {
        {m_btnPlay, [](int g) { return g / 8; }},
        {m_btnPause, [](int g) { return (6 * g) / 32; }},
        {m_btnStop, [](int g) { return g / 4; }},
        {m_btnReverse, [](int g) { return (10 * g) / 32; }},
        {m_btnForward, [](int g) { return (12 * g) / 32; }},
    };
    for (const auto& [button, offset] : row) {
        const int canvasWidth = m_glPane ? m_glPane->getWidth() : 0;
        button->SetSize(base + offset(canvasWidth), y, m_buttonSize.x, m_buttonSize.y, wxSIZE_AUTO);
    }
}

void MorvanePlugConfig::OnPaint(wxPaintEvent& event)
{
    if (IsShown() && m_glPane)
        m_glPane->OnRender(event);
}

void MorvanePlugConfig::OnEraseBackground(wxEraseEvent& event)
{
    if (m_glPane)
        m_glPane->OnEraseBackground(event);
}
