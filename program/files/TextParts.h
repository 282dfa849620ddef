#pragma once

#include "GeometryBuilder.h"
#include "JoinedArrays.h"

#include <atomic>
#include <exception>
#include <memory>
#include <vector>

namespace ModelingProgram {

/// About how many bytes of a text a thread reads at a time: milliseconds of work.
inline constexpr std::size_t kTextPartBytes = std::size_t{1} << 21;

/// A text in parts, which are read in parallel and then joined in their order. Each has whole lines, its own scanner, its
/// own `GeometryBuilder builder`, and whatever else its format needs. A small text is one part, whose results are moved,
/// not copied: it is read as if there were no parts.
template <class Part> class TextParts {
public:
    /// \param bounds     where each part begins, and the end of the last one
    /// \param arguments  of the constructors of all parts, after the file, the begin and the end of the part
    template <class... Arguments>
    TextParts(InputFile const& file, std::vector<std::size_t> const& bounds, Arguments const&... arguments)
        : file_(file)
    {
        for (std::size_t part = 0; part + 1 < bounds.size(); ++part)
            parts_.push_back(std::make_unique<Part>(file, bounds[part], bounds[part + 1], arguments...));
    }

    std::size_t count() const { return parts_.size(); }
    Part& operator[](std::size_t part) const { return *parts_[part]; }

    std::vector<Part*> pointers() const
    {
        std::vector<Part*> result;
        for (auto const& part : parts_)
            result.push_back(part.get());
        return result;
    }

    /// Calls `read(part, index)` for all parts, in parallel, until one returns false: the text ends in that part, and those
    /// after it are dropped. If calls for the parts up to there throw, the first exception in the order of the parts is
    /// thrown, which is that of the lowest line.
    template <class Read> void read(Read const& read)
    {
        std::vector<std::exception_ptr> failures(parts_.size());
        std::atomic<std::size_t> last = parts_.size(); // no part after it counts
        forEachPart(parts_.size(), [&](std::size_t part) {
            bool endsText = true;
            if (part > last)
                return;
            try {
                endsText = !read(*parts_[part], part);
            } catch (...) {
                failures[part] = std::current_exception();
            }
            for (std::size_t known = last; endsText && part < known && !last.compare_exchange_weak(known, part);) { }
        });
        if (last == parts_.size())
            return;
        if (failures[last])
            std::rethrow_exception(failures[last]);
        parts_.resize(last + 1);
    }

    /// Gives back the memory of the text, which has been read, before the parts are joined. Lenient readers may still
    /// refuse geometry without any usable element, and then name a line: the text is kept if there may be no such.
    void releaseText() const
    {
        bool const areUsable = std::none_of(parts_.begin(), parts_.end(),
            [](std::unique_ptr<Part> const& part) { return part->builder.hasUnusableElements(); });
        if (parts_.size() > 1 && areUsable)
            file_.unload();
    }

    /// Moves the points and faces of all parts to `whole`.
    void joinGeometry(GeometryBuilder& whole) const
    {
        std::vector<GeometryBuilder*> builders;
        for (auto const& part : parts_)
            builders.push_back(&part->builder);
        whole.join(builders);
    }

    /// The values that parts have in an array, one after another.
    template <class T> Orvan::Array<T> joined(Orvan::Array<T> Part::*array) const
    {
        return joinedArray(pointers(), array);
    }

    template <class T> T sum(T Part::*number) const
    {
        T result{};
        for (auto const& part : parts_)
            result += (*part).*number;
        return result;
    }

private:
    InputFile const& file_;
    std::vector<std::unique_ptr<Part>> parts_;
};

/// A part of a text whose elements have a line each.
struct LinePart {
    LinePart(InputFile const& file, std::size_t begin, std::size_t end, TextScanner::Syntax syntax)
        : in(file, begin, syntax)
        , counter(file, begin, end, syntax)
    {
    }

    TextScanner in; // which does not end with the part: messages tell how many bytes follow in the file
    TextScanner counter;
};

/// Calls `part.read(first, end)` for all parts, with the elements that begin in them. Texts in one part are scanned once,
/// others twice, because the elements are counted first.
/// \return the end of the last element in the file
template <class Part> std::size_t readLines(TextParts<Part>& parts, std::uint64_t elementCount)
{
    // The last part needs no count: it has all remaining elements, and tells if lines are missing.
    std::size_t const partCount = parts.count();
    std::vector<std::uint64_t> firsts(partCount + 1);
    forEachPart(partCount - 1, [&](std::size_t part) { firsts[part + 1] = parts[part].counter.countLines(); });
    for (std::size_t part = 1; part != partCount; ++part)
        firsts[part] = std::min(elementCount, firsts[part - 1] + firsts[part]);
    firsts[partCount] = elementCount;
    parts.read([&](Part& part, std::size_t index) {
        part.read(firsts[index], firsts[index + 1]);
        part.in.countWorkLeft();
        return true;
    });
    std::size_t last = partCount - 1;
    while (last != 0 && firsts[last] == elementCount)
        --last;
    return parts[last].in.position();
}

}
