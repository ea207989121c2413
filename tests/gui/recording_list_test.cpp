// The recording list: its rows in local time, the status line, and the
// activation of a row, by the mouse and by the keyboard.
#include <wx/uiaction.h>

#include "tests/gui/panel_fixture.h"
#include "tests/support/time_zone.h"

namespace {

std::vector<std::vector<wxString>> Rows(CPlugListCtrl* list)
{
    std::vector<std::vector<wxString>> rows;
    for (long i = 0; i < list->GetItemCount(); ++i)
        rows.push_back({list->GetItemText(i, 0), list->GetItemText(i, 1), list->GetItemText(i, 2)});
    return rows;
}

TEST_F(PanelTest, RowsShowLocalTimesInTheWorkstationsZone)
{
    // 1970-01-01 23:59:50 to 1970-01-02 00:00:10 UTC, a day in 2023, and one
    // past 2038, whose times are unsigned on the disk.
    WriteDisk(0, {{86390, 86410}, {1700000000, 1700003600}, {0, 10}, {3000000000u, 3000000600u}});
    {
        TimeZone utc("UTC");
        MorvanePlugConfig* p = OpenPanel();
        p->SendHddList(0);
        EXPECT_EQ(Rows(p->m_recordList), (std::vector<std::vector<wxString>>{
                                              {"0.", "1970/01/01 23:59:50", "1970/01/02 00:00:10"},
                                              {"1.", "2023/11/14 22:13:20", "2023/11/14 23:13:20"},
                                              {"2.", "1970/01/01 00:00:00", "1970/01/01 00:00:10"},
                                              {"3.", "2065/01/24 05:20:00", "2065/01/24 05:30:00"}}));
        EXPECT_EQ(p->m_recordList->GetItemData(1), 1700000000);
        EXPECT_TRUE(p->m_recordList->IsShown());
    }
    {
        TimeZone tokyo("JST-9");
        MorvanePlugConfig* p = OpenPanel();
        p->SendHddList(0);
        EXPECT_EQ(Rows(p->m_recordList)[1],
                  (std::vector<wxString>{"1.", "2023/11/15 07:13:20", "2023/11/15 08:13:20"}));
        EXPECT_STREQ(p->Catalog()->Entries[1].TimeText, "22:13:20-23:13:20");  // the catalogue stays in UTC
    }
}

// A drive that cannot be read empties the list, so no row of the drive
// chosen before can be played under this one's name, and the line under the
// buttons says why; a good drive says what it holds.
TEST_F(PanelTest, StatusLineSaysWhatTheDriveHoldsOrWhyItCannotBeRead)
{
    TimeZone utc("UTC");
    WriteDisk(0, {{1700000000, 1700000600}, {1700003600, 1700007200}});
    WriteNonDisk(1);
    WriteDisk(2, {});
    const std::string d = dir_ + "/disk";
    const struct {
        int drive;
        int rows;
        std::string status;
    } cases[] = {
        {0, 2, "PHYSICALDRIVE0 (" + d + "0.img): 2 recordings, 2023-11-14 22:13 to 2023-11-15 00:13 (local time)"},
        {1, 0, "PHYSICALDRIVE1 (" + d + "1.img): not a recorder disk: no superblock at the start"},
        {0, 2, "PHYSICALDRIVE0 (" + d + "0.img): 2 recordings, 2023-11-14 22:13 to 2023-11-15 00:13 (local time)"},
        {3, 0, "PHYSICALDRIVE3 (" + d + "3.img): cannot open: No such file or directory"},
        {2, 0, "PHYSICALDRIVE2 (" + d + "2.img): no recordings"},
    };
    MorvanePlugConfig* p = OpenPanel();
    for (const auto& c : cases) {
        p->SendHddList(c.drive);
        EXPECT_EQ(p->m_recordList->GetItemCount(), c.rows) << c.drive;
        EXPECT_EQ(p->m_recordCount, c.rows);
        EXPECT_EQ(p->m_statusLine->GetToolTipText().utf8_string(), c.status);
        EXPECT_TRUE(p->m_recordList->IsShown());
    }
    p->SendHddList(1);
    p->SendMorvaneCommand(0);  // the first row of drive 0 is gone with it
    EXPECT_TRUE(Events(iEVT_HDD_CONNECTED).empty());
}

TEST_F(PanelTest, ActivatingARowPlaysThatRowOnce)
{
    WriteDisk(0, {{100, 200}, {300, 400}, {500, 600}});
    MorvanePlugConfig* p = OpenPanel();
    p->SendHddList(0);
    wxListEvent activate(wxEVT_LIST_ITEM_ACTIVATED, p->m_recordList->GetId());
    activate.SetEventObject(p->m_recordList);
    activate.m_itemIndex = 2;
    p->m_recordList->GetEventHandler()->ProcessEvent(activate);
    const std::vector<HostEventRecord> connects = Events(iEVT_HDD_CONNECTED);
    ASSERT_EQ(connects.size(), 1u);
    EXPECT_EQ(connects[0].record, 2u);
    EXPECT_EQ(connects[0].address, "127.0.0.1");
    EXPECT_EQ(connects[0].path, wxString(dir_ + "/disk0.img"));
    EXPECT_EQ(p->m_currentRecord, 2);
    EXPECT_EQ(p->m_playState, 0);
}

// Real keys, through the X server: arrows, Home and End move in the list,
// Enter plays the focused row.
TEST_F(PanelTest, KeyboardMovesThroughTheRowsAndEnterPlays)
{
    WriteDisk(0, {{100, 200}, {300, 400}, {500, 600}, {700, 800}});
    MorvanePlugConfig* p = OpenPanel();
    p->SendHddList(0);
    p->m_dialog->Raise();
    p->m_recordList->SetFocus();
    p->m_recordList->SetItemState(0, wxLIST_STATE_FOCUSED | wxLIST_STATE_SELECTED,
                                  wxLIST_STATE_FOCUSED | wxLIST_STATE_SELECTED);
    gui::Pump(100);
    wxUIActionSimulator keys;
    const struct {
        int key;
        long focused;
    } steps[] = {{WXK_DOWN, 1}, {WXK_DOWN, 2}, {WXK_END, 3}, {WXK_HOME, 0}, {WXK_DOWN, 1}};
    for (const auto& step : steps) {
        keys.Char(step.key);
        gui::Pump(60);
        EXPECT_EQ(p->m_recordList->GetNextItem(-1, wxLIST_NEXT_ALL, wxLIST_STATE_FOCUSED), step.focused);
    }
    EXPECT_TRUE(Events(iEVT_HDD_CONNECTED).empty());
    keys.Char(WXK_RETURN);
    gui::Pump(100);
    const std::vector<HostEventRecord> connects = Events(iEVT_HDD_CONNECTED);
    ASSERT_EQ(connects.size(), 1u);
    EXPECT_EQ(connects[0].record, 1u);
}

TEST_F(PanelTest, PlayingOutsideTheCatalogueDoesNothing)
{
    MorvanePlugConfig* p = OpenPanel();
    p->SendMorvaneCommand(0);  // no catalogue yet
    WriteDisk(0, {{100, 200}});
    p->SendHddList(0);
    p->SendMorvaneCommand(-1);
    p->SendMorvaneCommand(8192);
    EXPECT_TRUE(Events(iEVT_HDD_CONNECTED).empty());
    EXPECT_EQ(p->m_currentRecord, -1);
    p->SendMorvaneCommand(1);     // past the rows: a slot this build did not fill names no recording
    p->SendMorvaneCommand(8191);
    EXPECT_TRUE(Events(iEVT_HDD_CONNECTED).empty());
}

}  // namespace
