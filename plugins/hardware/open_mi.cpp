#include <unistd.h>

#include "plugins/hardware/hardware_mi.h"
#include "plugins/hardware/storage/devices.h"

/// The plug-in's one entry: hands out the plug-in object. @return 0
extern "C" __attribute__((visibility("default"))) int OpenMI(IC::ManagementInterface** mi,
                                                             IC::Error** error) {
    static hardware::HardwareMI plugin{
        hardware::Host("", geteuid() == 0, std::make_shared<hardware::Devices>(hardware::ownDevices()))};
    static IC::Error result;
    *mi = &plugin;
    *error = &result;
    return 0;
}
