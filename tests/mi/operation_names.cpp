#include "tests/mi/operation_names.h"

#include <fstream>
#include <regex>
#include <sstream>
#include <vector>

namespace {

namespace fs = std::filesystem;
using Names = std::map<std::string, std::set<std::string>>;

// What the components' operations are made of: nobody outside calls it, and no log line carries its name.
const std::set<std::string> kHelpers = {
    "mi/command.h",
    "mi/host_node.h",
    "mi/line_file.h",
    "mi/log.h",
    "mi/property_table.h",
    "mi/text.h",
    "network/port_walk.h",
    "network/routes_file.h",
    "network/interface_file.h",
    "network/ip_facts.h",
};

std::string sourceOf(const std::string& component) {
    if (component == "indications") {
        return "OsHwMIInd_ix86";
    }
    return component == "cpu" ? "OsHwMICpu_ix86" : "OsHwMI_ix86";
}

/// The code of a header. A comment that names a component ("// cpu/ ...") heads the members that are
/// implemented there and becomes a statement of its own.
std::string codeOf(const fs::path& header) {
    std::ifstream in(header);
    std::string code;
    const std::regex heading(R"re(^\s*// ([a-z]+)/.*)re");
    const std::regex noise(R"re("(\\.|[^"\\])*"|'(\\.|[^'\\])'|//.*|^\s*#.*|__attribute__\(\(.*?\)\)\)?)re");
    for (std::string line; std::getline(in, line);) {
        std::smatch component;
        if (std::regex_match(line, component, heading)) {
            code += ";component " + component[1].str() + ";\n";
        } else {
            code += std::regex_replace(line, noise, "") + '\n';
        }
    }
    return code;
}

/// One header read from its start to its end.
class Reader {
public:
    Reader(const fs::path& header, std::string component, Names& names)
        : code_(codeOf(header)), component_(std::move(component)), names_(names) {}

    void read() {
        for (; at_ < code_.size(); ++at_) {
            const char letter = code_[at_];
            if (letter == '{') {
                open();
            } else if (letter == '}') {
                isPublic_.pop_back();
                statement_.clear();
            } else if (letter == ';') {
                end();
            } else if (letter == ':' && isAccess()) {
                statement_.clear();
            } else {
                statement_ += letter;
            }
        }
    }

private:
    /// Scopes are gone into; a body is passed over, and so is what initializes a variable.
    void open() {
        static const std::regex scope(
            R"re(^\s*(template <.*>\s*)?(namespace|class|struct|extern)\b[^(=]*$)re");
        static const std::regex nodeClass(R"re(class (\w+) :+ public NodeOf<)re");
        if (std::smatch node; std::regex_search(statement_, node, nodeClass)) {
            names_[node[1]].insert(sourceOf(component_));
            names_['~' + node[1].str()].insert(sourceOf(component_));
        }
        if (std::regex_search(statement_, scope)) {
            isPublic_.push_back(isPublic_.back() && statement_.find("class ") == std::string::npos);
            statement_.clear();
            return;
        }
        end();
        for (int depth = 0; at_ < code_.size(); ++at_) {
            depth += code_[at_] == '{' ? 1 : code_[at_] == '}' ? -1 : 0;
            if (depth == 0) {
                return;
            }
        }
    }

    /// "public:" and the like; the colons of "QX::Event" and of a base class are no ends.
    bool isAccess() {
        static const std::regex access(R"re(^\s*(public|protected|private)$)re");
        std::smatch match;
        if (!std::regex_match(statement_, match, access)) {
            statement_ += ':';
            return false;
        }
        isPublic_.back() = isPublic_[isPublic_.size() - 2] && match[1] != "private";
        return true;
    }

    void end() {
        static const std::regex component(R"re(^\s*component ([a-z]+)$)re");
        static const std::regex declared(R"re((~?[A-Za-z_]\w*)\s*\()re");
        std::smatch match;
        if (std::regex_match(statement_, match, component)) {
            component_ = match[1];
        } else if (isPublic_.back() && std::regex_search(statement_, match, declared)) {
            names_[match[1]].insert(sourceOf(component_));
        }
        statement_.clear();
    }

    std::string code_;
    std::string component_;
    Names& names_;
    std::size_t at_ = 0;
    std::string statement_;
    std::vector<bool> isPublic_{true};
};

}  // namespace

Names operationNames(const fs::path& tree) {
    Names names;
    for (const char* component : {"mi", "computer", "storage", "network", "indications", "cpu", "oshwmi"}) {
        for (const auto& entry : fs::directory_iterator(tree / component)) {
            const std::string name = fs::relative(entry.path(), tree);
            if (name.ends_with(".h") && !kHelpers.contains(name)) {
                Reader(entry.path(), component, names).read();
            }
        }
    }
    names["OpenMI"] = {"OsHwMI_ix86"};  // the entry has no header: the agent looks it up by its name
    return names;
}
