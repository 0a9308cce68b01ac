#pragma once

/// Marks what the framework library shows to the plug-in and the agent; all else stays inside.
#define CORVISTA_API __attribute__((visibility("default")))
