#pragma once

#include <gtest/gtest.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <functional>
#include <map>
#include <sstream>
#include <string>
#include <vector>

#include "framework/qx/property_file.h"

/// A directory of the test's own with the path of one property file in it.
class PropertyFileFixture : public testing::Test {
protected:
    PropertyFileFixture() {
        std::string pattern = std::filesystem::temp_directory_path() / "property_file.XXXXXX";
        directory_ = mkdtemp(pattern.data());
        path_ = directory_ / "asset.dat";
    }
    ~PropertyFileFixture() override { std::filesystem::remove_all(directory_); }

    void put(const std::string& content) const { std::ofstream(path_, std::ios::binary) << content; }
    std::string content() const {
        std::ostringstream text;
        text << std::ifstream(path_, std::ios::binary).rdbuf();
        return text.str();
    }
    std::map<std::wstring, std::wstring> readAll() const {
        QX::PropertyFile file(path_.string());
        file.open(1);
        std::map<std::wstring, std::wstring> values;
        for (const std::wstring& key : file.enumerateKeys()) {
            values[key] = file.getValue(key);
        }
        file.close();
        return values;
    }
    void write(const std::map<std::wstring, std::wstring>& values) const {
        QX::PropertyFile file(path_.string());
        file.open(3);
        for (const auto& [key, value] : values) {
            file.setValue(key, value);
        }
        file.close();
    }
    std::vector<std::string> names() const {
        std::vector<std::string> found;
        for (const auto& entry : std::filesystem::directory_iterator(directory_)) {
            found.push_back(entry.path().filename());
        }
        std::sort(found.begin(), found.end());
        return found;
    }
    static std::string textOfFailure(const std::function<void()>& call) {
        try {
            call();
        } catch (const QX::PropertyFileError& error) {
            return error.what();
        }
        return "no failure";
    }

    std::filesystem::path directory_;
    std::filesystem::path path_;
};
