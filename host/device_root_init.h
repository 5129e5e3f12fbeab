#ifndef ORVA_HOST_DEVICE_ROOT_INIT_H_
#define ORVA_HOST_DEVICE_ROOT_INIT_H_

#include <string>

// Provisions a device root at `root` (made when missing): the tool links in
// usr/orva/bin, an empty certificate store, the system configuration, the
// service and plug-in folders, the ACME challenge folder, the host's access
// token (mode 0600) and the MAC address file. Never overwrites what exists.
// Returns true on success; false with a message in *error, leaving what was
// made so far.
bool InitDeviceRoot(const std::string& root, std::string* error);

// Makes `root` absolute in *absolute and exports it as ORVA_ROOT, the
// device root of the module and the system library. Returns false, with
// nothing exported, when `root` does not exist.
bool UseDeviceRoot(const std::string& root, std::string* absolute);

// Path of the host's access token inside the device root `root`.
std::string TokenPath(const std::string& root);

// The folder, inside the device root `root`, whose files the web server
// offers at /.well-known/acme-challenge/ (readable by everyone: nginx's
// workers may run as another user).
std::string AcmeChallengeFolder(const std::string& root);

#endif  // ORVA_HOST_DEVICE_ROOT_INIT_H_
