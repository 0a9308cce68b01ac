#pragma once

namespace IC {

/// Status of a node whose device is there and works.
constexpr unsigned int kStatusGood = 1;

}  // namespace IC

namespace IC::NodeType {

// What the agent knows a node's class by.
constexpr unsigned int chassis = 1;
constexpr unsigned int processor = 4;
constexpr unsigned int hardDrive = 11;
constexpr unsigned int networkPort = 12;
constexpr unsigned int ipConfiguration = 29;
constexpr unsigned int osHardware = 38;
constexpr unsigned int computer = 40;
constexpr unsigned int planar = 41;
constexpr unsigned int partition = 45;
constexpr unsigned int networkController = 49;
constexpr unsigned int diskController = 50;
constexpr unsigned int networkTeam = 56;
constexpr unsigned int root = 59;
constexpr unsigned int lanEndPoint = 73;

}  // namespace IC::NodeType
