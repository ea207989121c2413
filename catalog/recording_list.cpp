// The catalogue build as the panel runs it when a drive is chosen, and the
// refill of the recording list from the catalogue.
#include <wx/datetime.h>

#include "catalog/build_summary.h"
#include "controls/plug_list_ctrl.h"
#include "panel/drive_discovery.h"
#include "panel/morvane_plug_config.h"

namespace {

// Seconds since 1970 (UTC) as the workstation's local date and time.
wxString LocalDateTime(std::uint32_t seconds)
{
    const wxDateTime when(wxLongLong(seconds) * 1000);
    const wxDateTime::Tm tm = when.GetTm(wxDateTime::Local);
    return wxString::Format("%04d/%02d/%02d %02d:%02d:%02d", tm.year, tm.mon + 1, tm.mday, tm.hour, tm.min, tm.sec);
}

}  // namespace

// A build that fails empties the catalogue, and so the list: rows of the
// disk chosen before must not stand under this one's name, and the row
// chosen before is no row of this disk: Play waits for a row to be chosen.
void MorvanePlugConfig::SendHddList(int drive)
{
    m_diskPath = DiskPathForDrive(drive);
    m_currentRecord = -1;
    BuildCatalog(std::string(m_diskPath.fn_str()));
    Setwxlist();
    ShowBuildSummary(drive);
}

void MorvanePlugConfig::ShowBuildSummary(int drive)
{
    const std::string summary = DescribeBuild(*this);
    const wxString text =
        wxString::Format("PHYSICALDRIVE%d (%s): %s", drive, m_diskPath, wxString::FromUTF8(summary.c_str()));
    // Two lines under the list and the buttons hold even a long image path.
    m_statusLine->SetLabelText(text);
    m_statusLine->Wrap(m_statusLine->GetSize().x);
    m_statusLine->SetToolTip(text);
}

void MorvanePlugConfig::Setwxlist()
{
    m_recordList->DeleteAllItems();
    m_recordList->Show(false);
    for (int i = 0; i < m_recordCount; ++i) {
        const CatalogEntry& entry = Catalog()->Entries[i];
        const long item = m_recordList->InsertItem(i, wxString::Format("%d.", i), 0);
        m_recordList->SetItemData(item, entry.StartSeconds());
        m_recordList->SetItem(item, 1, LocalDateTime(entry.StartSeconds()), -1);
        m_recordList->SetItem(item, 2, LocalDateTime(entry.EndSeconds()), -1);
    }
    m_recordList->Show(true);
}
