#include <TessaraMathSupport/Loggers.h>

#include <charconv>
#include <cstdio>
#include <cstring>
#include <mutex>
#include <utility>

namespace CoreGL {

namespace {

    // One null-terminated line in a fixed buffer, so that logging does not allocate.
    class StepLine {
    public:
        StepLine(unsigned int number, float increment, float remainder)
        {
            append("step ");
            append(number);
            append(": ");
            append(increment);
            append(", ");
            append(remainder);
            append(" remain");
        }

        char const* text() const noexcept { return text_; }

        void append(char const* text)
        {
            std::size_t const length = std::strlen(text);
            std::memcpy(end_, text, length + 1);
            end_ += length;
        }

    private:
        template <class Number> void append(Number value)
        {
            end_ = std::to_chars(end_, text_ + sizeof text_, value).ptr;
            *end_ = '\0';
        }

        char text_[80]; // 10 digits, two floats of up to 15 characters, and 18 characters around them
        char* end_ = text_;
    };

    struct SharedSink {
        std::mutex mutex;
        OrvanLogger::Sink sink;
    };

    // Created on first use and never destroyed: programs may log while static objects are destroyed.
    SharedSink& sharedSink()
    {
        static SharedSink& shared = *new SharedSink;
        return shared;
    }

}

void ConsoleLogger::logStep(unsigned int number, float increment, float remainder) const
{
    StepLine line(number, increment, remainder);
    line.append("\n");
    std::fputs(line.text(), stdout); // one call per line: stdio locks the stream for it
}

void OrvanLogger::setSink(Sink sink)
{
    std::lock_guard const lock(sharedSink().mutex);
    sharedSink().sink.swap(sink);
}

void OrvanLogger::logStep(unsigned int number, float increment, float remainder) const
{
    std::lock_guard const lock(sharedSink().mutex);
    if (sharedSink().sink)
        sharedSink().sink(StepLine(number, increment, remainder).text());
}

}
