#ifndef ORVA_PLATFORM_OLIB_OLIB_PLUGIN_H_
#define ORVA_PLATFORM_OLIB_OLIB_PLUGIN_H_

// Plug-in notification. The plug-ins of a group are the executable files in
// "/usr/orva/etc/plugins/GROUP/" under the device root; an action runs each
// of them, in name order, with the arguments EVENT and the action number.

struct OLIBPluginContext;
typedef OLIBPluginContext* OLIBPLUGIN_HANDLE;

// Seconds one plug-in may run before its process group is killed.
constexpr int kOLIBPluginActionSeconds = 30;

// Prepares a handle for `event` of `group`, collecting the group's plug-ins
// (a group without a directory has none). On success stores a new handle in
// *handle, which the caller releases with OLIBPluginExit, and returns 0. On
// failure (null argument, a group name that is not a plain file name, an
// event that is empty or holds a control character, out of memory) returns
// -1 with the last error set and leaves *handle unchanged.
int OLIBPluginSDKInit(const char* group, const char* event,
                      OLIBPLUGIN_HANDLE* handle);

// Nonzero when `handle` was filled by OLIBPluginSDKInit and not released.
int OLIBPluginHasInit(OLIBPLUGIN_HANDLE handle);

// Runs every plug-in of the handle with the arguments (event, `action` as a
// decimal number). All plug-ins run even when one fails. Returns 0 when each
// exited with status 0, -1 otherwise (also for a null handle), with the last
// error set.
int OLIBPluginAction(int action, OLIBPLUGIN_HANDLE handle);

// Releases what the handle holds. Null is ignored. The handle must not be
// used afterwards.
void OLIBPluginExit(OLIBPLUGIN_HANDLE handle);

#endif  // ORVA_PLATFORM_OLIB_OLIB_PLUGIN_H_
