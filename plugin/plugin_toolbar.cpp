// The plugin's toolbar: one tool that opens the playback panel.
#include <wx/image.h>
#include <wx/intl.h>
#include <wx/log.h>
#include <wx/msgdlg.h>
#include <wx/stdpaths.h>

#include "plugin/morvane_plugin.h"

CPlugToolBar* MorvanePlugin::CreateToolBar(wxWindow* parent)
{
    wxInitAllImageHandlers();
    wxImage image;
    {
        wxLogNull quiet;  // the one message about a missing image is the box below
        image.LoadFile(wxStandardPaths::Get().GetDataDir() + "/plugimages/remoteplay.png", wxBITMAP_TYPE_ANY, -1);
    }
    if (!image.IsOk())
        wxMessageBox("Failed to load Images", wxMessageBoxCaptionStr, wxOK | wxCENTRE, nullptr);

    m_toolBar = new CPlugToolBar(parent, iEVT_REMOTEPLAY_TOOLBAR, wxDefaultPosition, wxDefaultSize, 0);
    m_toolBar->SetToolBitmapSize(wxSize(32, 32));
    m_toolBar->AddTool(iEVT_REMOTEPLAY_TOOLBAR, wxGetTranslation("Remote Play"),
                       image.IsOk() ? wxBitmap(image, -1) : wxBitmap(), wxGetTranslation("Remote Play Plugin Toolbar"),
                       wxITEM_NORMAL);
    m_toolBar->Realize();
    return m_toolBar;
}
