#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "agent/core/catalogue.h"
#include "agent/core/plugin.h"

namespace cvagent {

/// Where a plug-in's names are kept: beside its library, libX.json of libX.so.1. There need be none.
std::string catalogueFileOf(const std::string& plugin);

/// Adds what a plug-in's file says to the catalogue, once. It costs only names: what is damaged, has the
/// number or the name of another class, or could be written by others is left out and told, and the plug-in's
/// nodes are shown with numbers. A plug-in without a file is no fault. Any thread.
void loadCatalogueOf(const std::string& plugin, const Tell& tell);

/// What a file's text comes to; docs/plug-ins.md describes it.
struct ParsedCatalogue {
    const CatalogueTable* table = nullptr;  ///< kept for ever; null when nothing of it is any good
    std::vector<std::string> complaints;    ///< a few words on each fault, not more than ten
};
/// @param owner whose it is, for messages
/// @param text of hostile hands: any bytes, any length up to the 1 MiB that is read
ParsedCatalogue parseCatalogue(const std::string& owner, std::string_view text);

}  // namespace cvagent
