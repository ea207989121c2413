// Drive discovery: the attached disks, probed in order until one cannot be
// opened, listed in the drive selector's tree.
#include "panel/drive_discovery.h"

#include <wx/file.h>
#include <wx/log.h>

#include "controls/plug_combo_ctrl.h"
#include "panel/morvane_plug_config.h"

namespace {

// The pattern with its one "%d" replaced by the number; a pattern with no
// "%d", or with any other '%', names nothing.
wxString ExpandPattern(const wxString& pattern, int drive)
{
    const size_t at = pattern.find("%d");
    if (at == wxString::npos || pattern.find('%', at + 2) != wxString::npos || pattern.find('%') != at)
        return wxString();
    return pattern.substr(0, at) + wxString::Format("%d", drive) + pattern.substr(at + 2);
}

}  // namespace

wxString DiskPathForDrive(int drive)
{
    if (drive < 0)
        return wxString();
    wxString pattern;
    if (wxGetEnv("MORVANE_DISK_PATTERN", &pattern) && !pattern.empty())
        return ExpandPattern(pattern, drive);
#ifdef __linux__
    if (drive >= 26)
        return wxString();
    return wxString("/dev/sd") + wxString(static_cast<char>('a' + drive));
#else
    return wxString::Format("/dev/disk%d", drive);
#endif
}

CDriverTreeNode::CDriverTreeNode() : m_driveIndex(-1) {}

CDriverTreeNode::~CDriverTreeNode() = default;

void MorvanePlugConfig::SetDriverTrees()
{
    wxFile probe;
    CInTreeCombo* tree = m_driveCombo->m_treePopup;
    const wxTreeItemId root = tree->AddRoot("Drivers", -1, -1, nullptr);
    for (int drive = 0;; ++drive) {
        const wxString path = DiskPathForDrive(drive);
        bool opened = false;
        {
            wxLogNull quiet;  // a missing disk ends the list; it is not an error to show
            opened = !path.empty() && probe.Open(path, wxFile::read, wxS_DEFAULT);
        }
        if (opened) {
            const wxTreeItemId child = tree->AppendItem(root, wxString(), 1, -1, nullptr);
            tree->SetItemText(child, wxString::Format("PHYSICALDRIVE%d", drive));
            auto* node = new CDriverTreeNode;
            node->m_driveIndex = drive;
            tree->SetItemData(child, node);
        }
        probe.Close();
        if (!opened)
            break;
    }
    probe.Close();
    // The drives are what the user came for: show them without a click on
    // the expand button first.
    if (tree->ItemHasChildren(root))
        tree->Expand(root);
}
