#pragma once

#include <map>
#include <stdexcept>
#include <string>
#include <vector>

#include "framework/export.h"
#include "framework/qx/path.h"

namespace QX {

/// A property file that cannot be opened, read or written; the text names the file and the reason.
class CORVISTA_API PropertyFileError : public std::runtime_error {
public:
    using std::runtime_error::runtime_error;
    ~PropertyFileError() override;
};

/// A file of keys and values: UTF-8 text, one `key=value` a line; backslash escapes newline (\n), itself, '='
/// in keys and, as \xHH, bytes that are not UTF-8. Of lines with the same key the last one counts. Lines that
/// are damaged (no '=', broken escape, not UTF-8) are passed over. What is written reaches the disk whole or
/// not at all. One object belongs to one thread.
class CORVISTA_API PropertyFile {
public:
    // Modes of open.
    static constexpr unsigned long forReading = 1;
    static constexpr unsigned long forWriting = 3;

    explicit PropertyFile(const File::Path& path);
    PropertyFile(const PropertyFile&) = delete;
    PropertyFile& operator=(const PropertyFile&) = delete;
    /// Changes that were not closed are dropped.
    ~PropertyFile();

    /// @param mode 1 reads an existing file; 3 reads what is there, accepts changes and creates the file.
    /// Throws PropertyFileError when the file cannot be read (mode 1: also when it is missing) or the mode is
    /// another. Opening an open file starts anew from the disk.
    void open(unsigned long mode);
    /// Writes the changes (mode 3) through a temporary file that replaces the old one. Throws
    /// PropertyFileError when that fails; the old file is then untouched and the object still open, so that
    /// close can be tried again.
    void close();

    /// The value of a key, or an empty text when the file has no such key.
    std::wstring getValue(const std::wstring& key) const;
    /// Sets a key, new or not. Throws PropertyFileError unless open in mode 3.
    void setValue(const std::wstring& key, const std::wstring& value);
    /// Adds a key with an empty value; a key that is there keeps its value. Throws as setValue does.
    void createKey(const std::wstring& key);
    /// All keys, in ascending order.
    std::vector<std::wstring> enumerateKeys() const;

private:
    void requireWritable() const;

    std::string path_;
    unsigned long mode_ = 0;  // 0 is closed
    bool changed_ = false;
    std::map<std::wstring, std::wstring> values_;
};

}  // namespace QX
