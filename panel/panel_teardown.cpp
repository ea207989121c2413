// Closing the panel's dialog, and deleting the panel.
#include "controls/plug_combo_ctrl.h"
#include "controls/plug_list_ctrl.h"
#include "panel/morvane_plug_config.h"

unsigned int MorvanePlugConfig::StopPlayback()
{
    QrixConnectEvent disconnect(iEVT_REMOTE_DISCONNECTED, 0);
    unsigned int address = 0;
    StringIPtoUint32(m_connAddress, address);
    if (m_decoder) {
        if (IsGoodIP(address, false)) {
            FillFromConnection(disconnect);
            EventManager::Get()->ProcessEvent(disconnect);
        }
        ReleaseDecoder();
    }
    return address;
}

void MorvanePlugConfig::ReleaseDecoder()
{
    // Detached from the canvas before it is asked to stop, so that it no
    // longer draws when the canvas goes.
    if (m_decoder->IsAlive()) {
        m_decoder->SetCanvas(nullptr);
        m_decoder->StopDecoder();
        m_decoder->Delete(nullptr);
    }
    m_decoder = nullptr;
}

void MorvanePlugConfig::DeleteCanvas()
{
    delete m_glPane;
    m_glPane = nullptr;
}

void MorvanePlugConfig::SendHostCommand(int type)
{
    auto* command = new QrixEvent(type, 0);
    EventManager::Get()->ProcessEvent(*command);
    delete command;
}

void MorvanePlugConfig::OnCloseWindow(wxCloseEvent&)
{
    const unsigned int address = StopPlayback();
    if (address != 0 && m_glPane)
        m_glPane->SetOffAllChannels(address, m_channelCount, 3);
    DeleteCanvas();
    m_dialog->Show(false);
    SendHostCommand(QRIX_CLOSE_ALL);
}

MorvanePlugConfig::~MorvanePlugConfig()
{
    const unsigned int address = StopPlayback();
    if (address != 0) {
        const DvrRecord* dvr = DvrManager::Get()->GetDvrByIP(address);
        if (dvr && m_glPane)
            m_glPane->SetOffAllChannels(address, dvr->channelCount, 3);
    }
    DeleteCanvas();
    CloseDVRFS();
    ReleaseCatalog();
    EventManager::Get()->RemoveAllEventSinksFor(this);

    // The dialog goes with the panel: once the panel is gone, nothing of the
    // dialog may reach it, and a dialog left on screen would be dead.
    m_driveCombo->m_treePopup->m_parentInstance = nullptr;
    m_recordList->SetparentInstance(nullptr);
    for (wxBitmapButton* button : {m_btnPlay, m_btnPause, m_btnStop, m_btnReverse, m_btnForward, m_btnSwitch})
        button->Disconnect(wxID_ANY, wxID_ANY, wxEVT_BUTTON, nullptr, nullptr, this);
    m_dialog->Disconnect(wxID_ANY, wxID_ANY, wxEVT_SIZE, nullptr, nullptr, this);
    m_dialog->Disconnect(wxID_ANY, wxID_ANY, wxEVT_CLOSE_WINDOW, nullptr, nullptr, this);
    m_dialog->Destroy();
}
