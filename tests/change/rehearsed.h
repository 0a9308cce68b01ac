#pragma once

#include <map>
#include <string>
#include <vector>

#include "agent/change/rehearsal.h"
#include "tests/support/fake_host.h"

/// The plan of changes on a host.
cvagent::change::Plan rehearsed(const std::vector<cvagent::change::Change>& changes,
                                const std::string& plugin = CORVISTA_PLUGIN_FILE,
                                cvagent::HostTools tools = cvagent::HostTools::native);
/// Why there is none; "" when there is one.
std::string whyNotRehearsed(const std::vector<cvagent::change::Change>& changes,
                            const std::string& plugin = CORVISTA_PLUGIN_FILE,
                            cvagent::HostTools tools = cvagent::HostTools::native);

/// Where the scripted tools keep what they saw becomes a place that a rehearsal can write to.
void moveRecords(FakeHost& host);

/// Below another root, where the kernel gives nobody a user namespace.
void enterJail(FakeHost& host);

/// Content of every file, and "-> TARGET" of every link, of the places that the plug-in writes to.
std::map<std::string, std::string> writtenPart(const FakeHost& host);
/// The same of the files that a plan changes; what is gone has none.
std::map<std::string, std::string> filesAfter(const cvagent::change::Plan& plan);

/// The values of all lines, one a line.
std::string joinedLines(const std::vector<std::string>& lines);
