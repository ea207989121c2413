// Which device a drive number names, and the tree item data of a drive.
#ifndef PANEL_DRIVE_DISCOVERY_H
#define PANEL_DRIVE_DISCOVERY_H

#include <wx/string.h>
#include <wx/treebase.h>

// The device of drive number N: the N-th of /dev/sda ... /dev/sdz on Linux,
// "/dev/disk%d" elsewhere, or, when the environment variable
// MORVANE_DISK_PATTERN holds a pattern with one "%d", that pattern with N
// (image files presented as attached disks). Empty when N names no device.
// The drive probe and the disk reader both use it, so N is their only link.
wxString DiskPathForDrive(int drive);

class CDriverTreeNode : public wxTreeItemData {
public:
    CDriverTreeNode();
    ~CDriverTreeNode() override;

    int m_driveIndex;
};

#endif
