#include "toolkit/FdStreamBuffer.h"

#include <fcntl.h>
#include <unistd.h>

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
        written_ += size_t(n);
    }
    // Each few megabytes written, the disk is set to work on them while the rest is written,
    // so that the flush at the end waits only for the last of them.
    if (written_ - started_ >= kWritebackStep) {
        ::sync_file_range(fd_, off_t(started_), off_t(written_ - started_), SYNC_FILE_RANGE_WRITE);
        started_ = written_;
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
