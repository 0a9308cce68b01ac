#pragma once

#include <initializer_list>
#include <optional>
#include <string>

#include "mi/line_file.h"

namespace IC {

// What the writers of interface files have in common.
inline constexpr char kBootProto[] = "BOOTPROTO=";
inline constexpr char kStaticBootProto[] = "BOOTPROTO=static\n";  ///< of a file that tells no origin
inline constexpr char kInterfaceFileOpened[] = "File open '/etc/sysconfig/network' in write mode.";  ///< log

/// The one line that a writer of interface files gives a key.
struct KeyLine {
    /// What a line that holds the key becomes. Keys share a line only in a file that was edited by hand; each
    /// writer goes on treating such a line as it always has, so that the file comes out as its owner expects.
    enum class Held {
        replaced,  ///< `line`; the keys behind this one look at the new text
        kept,      ///< it stays: an origin that the file tells is not overwritten; the next keys look at it
        keptUntouched,  ///< it stays and no other key looks at it: the mask never replaces an origin
    };

    const char* key;   ///< looked for anywhere in a line: "IPADDR_" finds every secondary address
    std::string line;  ///< with its line break; "" appends nothing
    Held held = Held::replaced;
    bool seen = false;  ///< whether a line held the key
};

/// The configuration file of an interface, /etc/sysconfig/network/ifcfg-eth-id-<hardware address>: read whole
/// when the object is made, changed by key, written back whole. A file that cannot be opened for reading is
/// created from what a writer appends; one that can, but not be read to its end, is logged at level 6000 and
/// never written, for that would lose the rest.
class InterfaceFile {
public:
    /// @param mac hardware address as getHardwareAddress gives it
    explicit InterfaceFile(const std::string& mac);

    static std::string pathOf(const std::string& mac);
    /// Looks for the keys in every line, in the order given, and marks those seen.
    void replace(std::initializer_list<KeyLine*> keys);
    /// Appends the lines of the keys that were not seen, in the order given.
    void appendMissing(std::initializer_list<const KeyLine*> keys);
    /// The last line as it stands now; "" when there is none.
    std::string lastLine() const;
    /// @param opened logged once the file is open, before anything is written; null for nothing
    /// @return whether the file could be opened for writing; it is the old one when not
    bool write(const char* opened = nullptr) const;

private:
    std::string path_;
    LineFile file_;
    bool isWhole_ = true;
};

/// What stands behind the '=' in the first line of an interface's file that holds a key, asked of the shell:
/// the file is found by the interface's hardware address.
/// @param key looked for anywhere in a line
/// @return as it was printed, line break included; nothing without such a line
std::optional<std::string> interfaceFileValue(const std::string& ifName, const char* key);

}  // namespace IC
