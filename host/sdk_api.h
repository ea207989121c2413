// Visibility of the host SDK: the host exports every SDK item, and a plugin
// built with hidden visibility must still see these declarations as the
// host's.
#ifndef HOST_SDK_API_H
#define HOST_SDK_API_H

#define QRIX_SDK_API __attribute__((visibility("default")))

#endif
