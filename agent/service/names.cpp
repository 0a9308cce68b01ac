#include "agent/service/names.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <string_view>

namespace cvagent::service {

namespace {

constexpr std::size_t kLongestPart = 200;

bool isPlain(char byte) {
    return (byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z') || (byte >= '0' && byte <= '9');
}

std::string escaped(std::string_view part) {
    static constexpr std::array kDigits = {'0', '1', '2', '3', '4', '5', '6', '7',
                                           '8', '9', 'a', 'b', 'c', 'd', 'e', 'f'};
    std::string text;
    for (const char byte : part.substr(0, kLongestPart)) {
        if (isPlain(byte)) {
            text += byte;
        } else {
            const auto code = static_cast<unsigned char>(byte);
            text += {'_', kDigits.at(code >> 4U), kDigits.at(code & 0xFU)};
        }
    }
    return text.empty() ? "_" : text;
}

}  // namespace

std::string objectOf(const std::string& nodePath) {
    std::string object = kRootObject;
    for (std::size_t start = nodePath.starts_with('/') ? 1 : 0; start <= nodePath.size();) {
        const std::size_t end = std::min(nodePath.find('/', start), nodePath.size());
        object += "/" + escaped(std::string_view(nodePath).substr(start, end - start));
        start = end + 1;
    }
    return object;
}

std::string interfaceOf(const std::string& className) {
    std::string name;
    bool begins = true;
    for (const char byte : className) {
        if (!isPlain(byte)) {
            begins = true;
            continue;
        }
        const bool small = byte >= 'a' && byte <= 'z';
        name += begins && small ? static_cast<char>(byte - 'a' + 'A') : byte;
        begins = false;
    }
    const bool taken = name == "Agent" || name == "Node" || name == "Error";
    if (name.empty() || taken || (name.front() >= '0' && name.front() <= '9')) {
        name.insert(0, "Class");
    }
    return std::string(kBusName) + "." + name.substr(0, kLongestPart);
}

std::string propertyNameOf(unsigned int id, const Property* row) {
    return row != nullptr ? row->name : "Property" + std::to_string(id);
}

}  // namespace cvagent::service
