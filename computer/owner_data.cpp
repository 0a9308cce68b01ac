#include "computer/owner_data.h"

#include "framework/qx/property_file.h"
#include "framework/qx/strings.h"

namespace IC {

OwnerData::OwnerData(const char* dataDirectory) : path_(std::string(dataDirectory) + "asset.dat") {}

std::string OwnerData::read(const wchar_t* key) const {
    QX::PropertyFile file{QX::File::Path(path_)};
    file.open(QX::PropertyFile::forReading);
    std::string text = QX::make_string(file.getValue(key));
    file.close();
    return text;
}

void OwnerData::write(const wchar_t* key, const std::string& text) const {
    QX::PropertyFile file{QX::File::Path(path_)};
    file.open(QX::PropertyFile::forWriting);
    file.setValue(key, QX::make_wstring(text));
    file.close();
}

}  // namespace IC
