#pragma once

#include <gtest/gtest.h>

#include <string>

#include "computer/computer_node.h"
#include "mi/globals.h"

/// A computer node on a host whose start-up is over.
class RunningComputer {
public:
    RunningComputer() { IC::OSHWMI::bInitflag = true; }

    unsigned char write(unsigned int id, const IC::PropertyValue& value) {
        return node_.setProperty(id, value).getStatus();
    }
    unsigned char write(unsigned int id, const std::string& text) {
        return write(id, IC::PropertyValue(text, true));
    }
    unsigned char write(unsigned int id, unsigned int number) {
        return write(id, IC::PropertyValue(IC::Number(number), true));
    }
    /// Fails the test unless the node answers.
    IC::PropertyValue read(unsigned int id) const {
        IC::PropertyValue value;
        EXPECT_EQ(node_.getProperty(id, value).getStatus(), 0) << id;
        return value;
    }
    unsigned char status(unsigned int id) const {
        IC::PropertyValue value;
        return node_.getProperty(id, value).getStatus();
    }
    std::string text(unsigned int id) const { return static_cast<std::string>(read(id)); }
    /// What the framework keeps, without asking the host.
    IC::PropertyValue stored(unsigned int id) const {
        IC::PropertyValue value;
        EXPECT_EQ(node_.IC::MutableNode::getProperty(id, value).getStatus(), 0) << id;
        return value;
    }
    bool stores(unsigned int id) const {
        IC::PropertyValue value;
        return node_.IC::MutableNode::getProperty(id, value).getStatus() == 0;
    }
    IC::ComputerNode& node() { return node_; }

private:
    IC::ComputerNode node_{3, 2, {1}, 40, 0};
};

/// A line of that many characters that begins with `start`, without its line break.
inline std::string lineOf(std::size_t length, const std::string& start) {
    return start + std::string(length - start.size(), 'x');
}
