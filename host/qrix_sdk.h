// Everything of the host SDK that a plugin uses.
#ifndef HOST_QRIX_SDK_H
#define HOST_QRIX_SDK_H

#include "host/sdk_events.h"
#include "host/sdk_plugin.h"
#include "host/sdk_services.h"
#include "host/sdk_video.h"

#endif
