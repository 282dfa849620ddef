#pragma once

#include "Scanner.h"

#include <set>

namespace ModelingProgram {

/// Distinct strings in order of appearance.
class Texts {
public:
    void add(std::string_view text)
    {
        if (!known_.insert(std::string(text)).second)
            return;
        lines_.append(lines_.empty() ? "" : "\n").append(text);
        if (known_.size() <= kShown)
            shown_ += (shown_.empty() ? "" : ", ") + TextScanner::quoted(text);
    }
    /// Adds those of other texts, which have one line each.
    void add(Texts const& others)
    {
        for (std::string_view rest = others.lines_; !rest.empty();) {
            std::string_view const line = rest.substr(0, rest.find('\n'));
            add(line);
            rest.remove_prefix(std::min(rest.size(), line.size() + 1));
        }
    }
    bool empty() const { return known_.empty(); }
    std::string list() const
    {
        return shown_ + (known_.size() > kShown ? " and " + std::to_string(known_.size() - kShown) + " more" : "");
    }
    std::string const& lines() const { return lines_; }
    std::string countedList() const { return std::to_string(known_.size()) + " (" + list() + ")"; }

private:
    static constexpr std::size_t kShown = 5;

    std::set<std::string> known_;
    std::string lines_;
    std::string shown_;
};

}
