#pragma once

#include <string>

#include "agent/core/catalogue.h"
#include "agent/core/text.h"

namespace cvagent {

/// What the terminal behind standard output can show.
struct Style {
    bool colour = false;
    bool lines = false;  ///< line-drawing characters; else ASCII

    /// Looks at standard output and at the locale, which the first call must find as the program was started.
    static const Style& detect();
    std::string strong(const std::string& text) const { return paint(text, "1"); }
    std::string faint(const std::string& text) const { return paint(text, "2"); }
    std::string bad(const std::string& text) const { return paint(text, "31"); }
    std::string good(const std::string& text) const { return paint(text, "32"); }

private:
    std::string paint(const std::string& text, const char* code) const;
};

/// Writes text to standard output. Throws Failure when it cannot be written, without a text when nobody reads
/// it any more.
void print(const std::string& text);
/// One message of the program to the standard error it was started with.
void complain(const std::string& text);
/// A question, in the same place; the answer is typed behind it.
void ask(const std::string& question);

/// A value for people: with its unit, its label, a size in GB and GiB.
/// @param property its row of the catalogue; null for a property that is not in it
std::string valueText(const Property* property, const IC::PropertyValue& value);

/// "80.0 GB (74.5 GiB)"
std::string sizeText(unsigned long long bytes);
/// Text filled up with blanks to a width; characters beyond ASCII count as one each.
std::string padded(const std::string& text, std::size_t width);

}  // namespace cvagent
