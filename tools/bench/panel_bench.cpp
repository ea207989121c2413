// The time from the choice of a drive holding 8192 recordings to the filled,
// shown recording list, and its two parts: the catalogue build and the list
// refill. Runs in a real window (under Xvfb when there is no display).
#include <benchmark/benchmark.h>
#include <unistd.h>

#include <cstdio>
#include <cstdlib>
#include <filesystem>

#include <wx/app.h>
#include <wx/evtloop.h>
#include <wx/frame.h>
#include <wx/image.h>

#include "controls/plug_list_ctrl.h"
#include "panel/drive_discovery.h"
#include "panel/morvane_plug_config.h"
#include "plugin/morvane_plugin.h"
#include "tools/dvrimage/dvr_image.h"

namespace {

constexpr int kRecordings = 8192;

class BenchApp : public wxApp {
public:
    bool OnInit() override { return true; }
};

struct Bench {
    std::filesystem::path dir;
    wxFrame* frame = nullptr;
    std::unique_ptr<Manager> manager;
    std::unique_ptr<MorvanePlugin> plugin;

    Bench()
    {
        dir = std::filesystem::temp_directory_path() / ("panel-bench-" + std::to_string(::getpid()));
        std::filesystem::create_directories(dir);
        dvrimage::Layout layout;
        layout.listMax = kRecordings;
        dvrimage::DiskImage image(layout);
        for (int i = 0; i < kRecordings; ++i) {
            dvrimage::Recording r = dvrimage::GeneratedRecording(i, 0, 0, 1700000000u + 600u * i,
                                                                 1700000000u + 600u * i + 500, 8, 1, 64);
            if (i + 1 < kRecordings)
                r.blocks.clear();
            image.Add(std::move(r));
        }
        image.Write((dir / "disk0.img").string());
        ::setenv("MORVANE_DISK_PATTERN", (dir / "disk%d.img").c_str(), 1);
        frame = new wxFrame(nullptr, wxID_ANY, "bench");
        frame->Show();
        manager = std::make_unique<Manager>(wxTheApp, frame);
        plugin = std::make_unique<MorvanePlugin>(manager.get());
        plugin->Configure();
    }
    ~Bench()
    {
        plugin.reset();
        frame->Destroy();
        std::filesystem::remove_all(dir);
    }
    MorvanePlugConfig& panel() { return *plugin->m_configPanel; }
};

Bench* g_bench = nullptr;

void BM_ChooseDriveToShownList(benchmark::State& state)
{
    MorvanePlugConfig& panel = g_bench->panel();
    for (auto _ : state) {
        panel.SendHddList(0);
        panel.m_recordList->Update();
        if (panel.m_recordList->GetItemCount() != kRecordings)
            state.SkipWithError("the list is not full");
    }
}

void BM_CatalogueBuild(benchmark::State& state)
{
    MorvanePlugConfig& panel = g_bench->panel();
    for (auto _ : state)
        if (panel.BuildCatalog(std::string(DiskPathForDrive(0).fn_str())) != CatalogBuild::kBuilt)
            state.SkipWithError("the build failed");
}

void BM_ListRefill(benchmark::State& state)
{
    MorvanePlugConfig& panel = g_bench->panel();
    panel.BuildCatalog(std::string(DiskPathForDrive(0).fn_str()));
    for (auto _ : state) {
        panel.Setwxlist();
        panel.m_recordList->Update();
    }
}

BENCHMARK(BM_ChooseDriveToShownList)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_CatalogueBuild)->Unit(benchmark::kMillisecond);
BENCHMARK(BM_ListRefill)->Unit(benchmark::kMillisecond);

}  // namespace

int main(int argc, char** argv)
{
    benchmark::Initialize(&argc, argv);
    wxApp::SetInstance(new BenchApp);
    if (!wxEntryStart(argc, argv) || !wxTheApp->CallOnInit()) {
        std::fprintf(stderr, "panel_bench: no display (run it under xvfb-run)\n");
        return 1;
    }
    wxInitAllImageHandlers();
    {
        wxEventLoop loop;
        wxEventLoopActivator active(&loop);
        g_bench = new Bench;
        benchmark::RunSpecifiedBenchmarks();
        delete g_bench;
        wxTheApp->ProcessIdle();
    }
    wxTheApp->OnExit();
    wxEntryCleanup();
    benchmark::Shutdown();
    return 0;
}
