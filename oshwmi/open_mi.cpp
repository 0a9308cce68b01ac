#include "mi/globals.h"
#include "mi/log.h"
#include "oshwmi/os_hw_mi.h"

/// The plug-in's one entry: hands out the plug-in object and the record of the last initialize's result.
/// @return 0
extern "C" __attribute__((visibility("default"))) int OpenMI(IC::ManagementInterface** mi, IC::Error** err) {
    const IC::LogScope scope;
    *mi = &IC::myoshwmi;
    *err = &IC::OSHWMI::myerr;
    return 0;
}
