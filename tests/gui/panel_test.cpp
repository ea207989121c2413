// The panel's dialog and layout, and its life: opening, closing, deleting.
#include <algorithm>

#include <wx/toplevel.h>

#include "tests/gui/panel_fixture.h"

namespace {

wxRect Bounds(wxWindow* w)
{
    return wxRect(w->GetPosition(), w->GetSize());
}

void Resize(MorvanePlugConfig* panel, int width, int height)
{
    wxSizeEvent event(wxSize(width, height));
    panel->OnSize(event);
}

bool IsTopLevel(wxWindow* window)
{
    for (wxWindow* w : wxTopLevelWindows)
        if (w == window)
            return true;
    return false;
}

TEST_F(PanelTest, DialogAndWidgetsAreBuiltAndShown)
{
    MorvanePlugConfig* p = OpenPanel();
    ASSERT_NE(p, nullptr);
    EXPECT_TRUE(p->m_dialog->IsShown());
    EXPECT_EQ(p->m_dialog->GetTitle(), "Morvane");
    EXPECT_EQ(p->m_driveLabel->GetLabel(), "Select Dvr");
    EXPECT_EQ(p->m_recordList->GetColumnCount(), 3);
    // The images of the build's data directory (the buttons' identifiers are
    // what the end-to-end session test presses them by).
    for (wxBitmapButton* b : {p->m_btnPlay, p->m_btnPause, p->m_btnStop, p->m_btnReverse, p->m_btnForward, p->m_btnSwitch})
        EXPECT_TRUE(b->GetBitmapLabel().IsOk());
    EXPECT_EQ(p->m_playState, 2);
    EXPECT_EQ(p->m_currentRecord, -1);
}

// Up to 600 pixels high the layout is fixed; above, the canvas grows and the
// transport buttons follow its width (the switch button stays); the canvas
// keeps at least one pixel. A real resize of the dialog lays it out too.
TEST_F(PanelTest, LayoutFollowsTheDialogSize)
{
    MorvanePlugConfig* p = OpenPanel();
    const struct {
        wxSize dialog;
        wxRect list, canvas;
        std::vector<int> buttonXs;
        int buttonY;
    } layouts[] = {
        {{1600, 600}, {10, 70, 180, 490}, {200, 10, 585, 500}, {395, 435, 475, 515, 555}, 530},
        {{1024, 768}, {10, 70, 180, 658}, {200, 10, 809, 668}, {485, 535, 586, 636, 687}, 698},
        {{1024, 601}, {10, 70, 180, 491}, {200, 10, 809, 501}, {485, 535, 586, 636, 687}, 531},
    };
    for (const auto& l : layouts) {
        Resize(p, l.dialog.x, l.dialog.y);
        EXPECT_EQ(Bounds(p->m_recordList), l.list) << l.dialog.x << "x" << l.dialog.y;
        EXPECT_EQ(Bounds(p->m_glPane), l.canvas);
        EXPECT_EQ(p->m_glPane->getWidth(), l.canvas.width);
        std::vector<int> xs;
        for (wxBitmapButton* b : {p->m_btnPlay, p->m_btnPause, p->m_btnStop, p->m_btnReverse, p->m_btnForward}) {
            xs.push_back(b->GetPosition().x);
            EXPECT_EQ(b->GetPosition().y, l.buttonY);
        }
        EXPECT_EQ(xs, l.buttonXs);
        EXPECT_EQ(Bounds(p->m_btnSwitch), wxRect(750, 530, 30, 30));
    }
    Resize(p, 100, 700);
    EXPECT_EQ(p->m_glPane->GetSize(), wxSize(1, 600));
    Resize(p, 215, 601);
    EXPECT_EQ(p->m_glPane->GetSize().x, 1);
    p->m_dialog->SetSize(1024, 768);
    gui::Pump(100);
    EXPECT_EQ(p->m_glPane->GetSize(), wxSize(1024 - 215, 768 - 100));
}

TEST_F(PanelTest, ClosingBeforePlaybackHidesTheDialogAndClosesAll)
{
    MorvanePlugConfig* p = OpenPanel();
    p->m_dialog->Close();
    gui::Pump();
    EXPECT_FALSE(p->m_dialog->IsShown());
    EXPECT_EQ(p->m_glPane, nullptr);
    EXPECT_TRUE(Events(iEVT_REMOTE_DISCONNECTED).empty());
    EXPECT_EQ(Events(QRIX_CLOSE_ALL).size(), 1u);
    // A tick after the close finds no canvas.
    QrixEvent tick(iEVT_TIMER_UPDATED);
    EventManager::Get()->ProcessEvent(tick);
    EXPECT_EQ(panel(), p);  // the panel stays until the plugin deletes it
}

TEST_F(PanelTest, OpeningTwiceLeavesOnePanelAndDestroysTheFirstDialog)
{
    MorvanePlugConfig* first = OpenPanel();
    wxDialog* firstDialog = first->m_dialog;
    MorvanePlugConfig* second = OpenPanel();
    gui::Pump(50);
    EXPECT_NE(second->m_dialog, firstDialog);
    EXPECT_FALSE(IsTopLevel(firstDialog));
    EXPECT_TRUE(IsTopLevel(second->m_dialog));
    EXPECT_TRUE(Events(QRIX_CLOSE_ALL).empty());  // deletion is no close
}

TEST_F(PanelTest, ReleaseThenDestructionDeletesThePanelOnce)
{
    OpenPanel();
    plugin_->OnRelease(false);
    EXPECT_EQ(panel(), nullptr);
    plugin_->OnRelease(false);
    delete plugin_;
    plugin_ = nullptr;
    EXPECT_EQ(EventManager::Get()->SinkCount(iEVT_TIMER_UPDATED), 0u);
}

TEST_F(PanelTest, CanvasPaintsThroughThePanelAndTicksRefreshOnlyAShownOne)
{
    MorvanePlugConfig* p = OpenPanel();
    const int before = p->m_glPane->Renders();
    p->m_glPane->Refresh();
    p->m_glPane->Update();
    gui::Pump(100);
    EXPECT_GT(p->m_glPane->Renders(), before);
    QrixEvent tick(iEVT_TIMER_UPDATED);
    EventManager::Get()->ProcessEvent(tick);
    EXPECT_EQ(p->m_glPane->TextureUpdates(), 1);
    p->Hide();
    EventManager::Get()->ProcessEvent(tick);
    EXPECT_EQ(p->m_glPane->TextureUpdates(), 1);
    plugin_->OnRelease(false);
    EventManager::Get()->ProcessEvent(tick);  // no panel: nothing to refresh
}


}  // namespace
