#include "toolkit/FdStreamBuffer.h"

#include <fcntl.h>
#include <sys/uio.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>

FdStreamBuffer::FdStreamBuffer(int fd, size_t capacity)
    : fd_(fd), buffer_(capacity > 0 ? capacity : 1) {
    setp(buffer_.data(), buffer_.data() + buffer_.size());
}

bool FdStreamBuffer::writeAll(const char* data, size_t size) {
    if (error_)
        return false;
    while (size > 0) {
        const ssize_t n = ::write(fd_, data, size);
        if (n < 0 && errno == EINTR)
            continue;
        if (n <= 0) {
            error_ = n < 0 ? errno : EIO;
            return false;
        }
        data += n;
        size -= size_t(n);
        wrote(size_t(n));
    }
    return true;
}

void FdStreamBuffer::wrote(size_t n) {
    written_ += n;
    if (written_ - started_ >= kWritebackStep) {
        ::sync_file_range(fd_, off_t(started_), off_t(written_ - started_), SYNC_FILE_RANGE_WRITE);
        started_ = written_;
    }
}

bool FdStreamBuffer::WriteGathered(const struct iovec* blocks, size_t count) {
    if (!drain())
        return false;
    // A few hundred blocks at a time, each call's short write finished before the next.
    constexpr size_t kPerCall = 256;
    struct iovec part[kPerCall];
    for (size_t first = 0; first < count;) {
        size_t n = 0;
        for (; n < kPerCall && first + n < count; ++n)
            part[n] = blocks[first + n];
        first += n;
        struct iovec* at = part;
        while (n > 0) {
            const ssize_t done = ::writev(fd_, at, int(n));
            if (done < 0 && errno == EINTR)
                continue;
            if (done <= 0) {
                error_ = done < 0 ? errno : EIO;
                return false;
            }
            wrote(size_t(done));
            for (size_t left = size_t(done); left > 0 || (n > 0 && at->iov_len == 0);) {
                const size_t step = std::min(left, at->iov_len);
                at->iov_base = static_cast<char*>(at->iov_base) + step;
                at->iov_len -= step;
                left -= step;
                if (at->iov_len > 0)
                    break;
                ++at;
                --n;
            }
        }
    }
    return true;
}

bool FdStreamBuffer::drain() {
    const size_t pending = size_t(pptr() - pbase());
    const bool ok = writeAll(pbase(), pending);
    setp(buffer_.data(), buffer_.data() + buffer_.size());
    return ok;
}

FdStreamBuffer::int_type FdStreamBuffer::overflow(int_type c) {
    if (!drain())
        return traits_type::eof();
    if (traits_type::eq_int_type(c, traits_type::eof()))
        return traits_type::not_eof(c);
    *pptr() = traits_type::to_char_type(c);
    pbump(1);
    return c;
}

std::streamsize FdStreamBuffer::xsputn(const char* s, std::streamsize n) {
    if (error_)
        return 0;
    const std::streamsize room = epptr() - pptr();
    if (n <= room) {
        traits_type::copy(pptr(), s, size_t(n));
        pbump(int(n));
        return n;
    }
    // Too large for what is left: empty the buffer and write the block straight through.
    if (!drain() || !writeAll(s, size_t(n)))
        return 0;
    return n;
}

int FdStreamBuffer::sync() {
    return drain() ? 0 : -1;
}
