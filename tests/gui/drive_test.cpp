// Drive discovery, the drive tree, and choosing a drive in its popup.
#include <cstdlib>

#include "panel/drive_discovery.h"
#include "tests/gui/panel_fixture.h"

namespace {

// Each drive of the tree as "label=drive number".
std::vector<std::string> Drives(MorvanePlugConfig* p)
{
    CInTreeCombo* tree = p->m_driveCombo->m_treePopup;
    std::vector<std::string> items;
    wxTreeItemIdValue cookie;
    for (wxTreeItemId c = tree->GetFirstChild(tree->GetRootItem(), cookie); c.IsOk();
         c = tree->GetNextChild(tree->GetRootItem(), cookie))
        items.push_back(tree->GetItemText(c).utf8_string() + "=" +
                        std::to_string(static_cast<CDriverTreeNode*>(tree->GetItemData(c))->m_driveIndex));
    return items;
}

// Drives 0, 1, 2 and 4 can be opened: the gap at 3 hides 4.
TEST_F(PanelTest, TreeListsEveryDriveUpToTheFirstThatCannotBeOpened)
{
    for (int drive : {0, 1, 2, 4})
        WriteNonDisk(drive);
    MorvanePlugConfig* p = OpenPanel();
    CInTreeCombo* tree = p->m_driveCombo->m_treePopup;
    EXPECT_EQ(tree->GetItemText(tree->GetRootItem()), "Drivers");
    EXPECT_EQ(Drives(p), (std::vector<std::string>{"PHYSICALDRIVE0=0", "PHYSICALDRIVE1=1", "PHYSICALDRIVE2=2"}));
}

TEST_F(PanelTest, DrivePatternNeedsExactlyOneNumber)
{
    for (const auto& [pattern, path] : {std::pair{"/images/disk%d.img", "/images/disk3.img"},
                                        std::pair{"/images/disk%s%d", ""}, std::pair{"/images/disk", ""}}) {
        ::setenv("MORVANE_DISK_PATTERN", pattern, 1);
        EXPECT_EQ(DiskPathForDrive(3), path) << pattern;
    }
    ::unsetenv("MORVANE_DISK_PATTERN");
    EXPECT_EQ(DiskPathForDrive(0), "/dev/sda");
    EXPECT_EQ(DiskPathForDrive(25), "/dev/sdz");
    EXPECT_EQ(DiskPathForDrive(26), "");
}

// A press beside a label chooses nothing and keeps the popup open; on the
// root it chooses the root without reading a disk; on a drive's label it
// builds that drive's catalogue; each choice closes the popup.
TEST_F(PanelTest, PressOnALabelChoosesItAndClosesThePopup)
{
    WriteDisk(0, {{100, 200}});
    WriteDisk(1, {{1700000000, 1700000600}, {1700001000, 1700001600}, {1700002000, 1700002600}});
    MorvanePlugConfig* p = OpenPanel();
    CInTreeCombo* tree = p->m_driveCombo->m_treePopup;
    p->m_driveCombo->Popup();
    gui::Pump(100);
    gui::ClickAt(tree, gui::LabelCentre(tree, "PHYSICALDRIVE0") + wxPoint(120, 0));
    EXPECT_TRUE(p->m_driveCombo->IsPopupShown());
    EXPECT_EQ(p->m_driveCombo->GetValue(), "");

    gui::ClickAt(tree, gui::LabelCentre(tree, "Drivers"));
    EXPECT_EQ(p->m_driveCombo->GetValue(), "Drivers");
    EXPECT_TRUE(p->m_diskPath.empty());
    EXPECT_EQ(p->Catalog(), nullptr);
    EXPECT_FALSE(p->m_driveCombo->IsPopupShown());

    p->m_driveCombo->Popup();
    gui::Pump(100);
    gui::ClickAt(tree, gui::LabelCentre(tree, "PHYSICALDRIVE1"));
    EXPECT_EQ(p->m_diskPath, wxString(dir_ + "/disk1.img"));
    EXPECT_EQ(p->m_recordList->GetItemCount(), 3);
    EXPECT_EQ(p->m_driveCombo->GetValue(), "PHYSICALDRIVE1");
    EXPECT_FALSE(p->m_driveCombo->IsPopupShown());
}

}  // namespace
