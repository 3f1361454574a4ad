// A line can be long, since it holds a whole trail, but not without limit: a file that is no export
// must not fill the memory. The first line is short.

#include "kzfp/exchange/line_reader.hpp"

#include <cerrno>

#include <fcntl.h>
#include <unistd.h>

#include "audio/source.hpp"
#include "kzfp/output/interruption.hpp"

namespace kzfp {

namespace {

constexpr size_t kBlock = size_t{1} << 18;
constexpr size_t kLongestLine = size_t{1} << 29;
constexpr size_t kLongestFirstLine = size_t{1} << 16;

audio::Descriptor open_lines(const std::string& path)
{
    if (path == "-") {
        return {STDIN_FILENO, audio::Descriptor::borrowed};
    }
    const int number = ::open(path.c_str(), O_RDONLY | O_CLOEXEC);
    if (number < 0) {
        throw audio::system_error("cannot be opened", errno);
    }
    return {number, audio::Descriptor::owned};
}

} // namespace

LineReader::LineReader(const std::string& path) : file_(open_lines(path)) {}

bool LineReader::fill()
{
    buffer_.erase(0, begin_);
    begin_ = 0;
    const size_t size = buffer_.size();
    const size_t longest = number_ == 0 ? kLongestFirstLine : kLongestLine;
    if (size > longest) {
        throw audio::FileError("line " + std::to_string(number_ + 1) + " has more than " +
                               std::to_string(longest) +
                               " bytes, so this is not an exported catalogue; pass a file that "
                               "'kzfp export' wrote");
    }
    buffer_.resize(size + kBlock);
    ssize_t count = -1;
    do {
        count = ::read(file_.number(), buffer_.data() + size, kBlock);
    } while (count < 0 && errno == EINTR && !interrupted());
    buffer_.resize(size + static_cast<size_t>(count < 0 ? 0 : count));
    if (count < 0 && !interrupted()) {
        throw audio::system_error("cannot be read", errno);
    }
    return count > 0;
}

bool LineReader::next(std::string& line)
{
    size_t looked_at = begin_;
    for (;;) {
        const size_t end = buffer_.find('\n', looked_at);
        if (end != std::string::npos || ended_) {
            const size_t stop = end == std::string::npos ? buffer_.size() : end;
            line.assign(buffer_, begin_, stop - begin_);
            const bool found = end != std::string::npos || stop > begin_;
            begin_ = end == std::string::npos ? stop : stop + 1;
            number_ += found ? 1 : 0;
            return found;
        }
        looked_at = buffer_.size() - begin_;
        ended_ = !fill();
    }
}

} // namespace kzfp
