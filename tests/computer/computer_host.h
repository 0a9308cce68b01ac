#pragma once

// Where the computer node keeps what it changes.
inline constexpr char kAssetFile[] = "/opt/vantrel/corvista/data/asset.dat";
inline constexpr char kClock[] = "/etc/sysconfig/clock";
inline constexpr char kHosts[] = "/etc/hosts";
inline constexpr char kHostName[] = "/etc/HOSTNAME";

/// A time zone to change to, in minutes east of Greenwich.
inline constexpr unsigned int kIndia = 330;
