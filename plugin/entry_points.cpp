// The four functions the host finds the plugin by, with plain names.
#include "plugin/morvane_plugin.h"

#define PLUGIN_EXPORT extern "C" __attribute__((visibility("default")))

PLUGIN_EXPORT Plugin* CreatePlugin(Manager* manager)
{
    return new MorvanePlugin(manager);
}

PLUGIN_EXPORT void ReleasePlugin(Plugin* plugin)
{
    delete plugin;
}

PLUGIN_EXPORT void GetPluginInfo(PluginInfo* info)
{
    info->author += "Morvane playback team";
    info->title += "MorvanePlugin";
    info->name += "MorvanePlugin";
    info->description += "MorvanePlugin Plugin - a small plugin that test qrix plugin system";
    info->version += "v1.0";
}

PLUGIN_EXPORT int GetPluginInterfaceVersion()
{
    return 1;
}
