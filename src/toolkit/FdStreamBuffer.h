#pragma once

#include <cstddef>
#include <streambuf>
#include <vector>

struct iovec;

// A stream buffer that writes into an open file descriptor (which it borrows, never closes).
// Every write(2) is checked: the first failure is kept in Error(), and from then on the
// buffer refuses everything, so that the stream that uses it goes bad and stays bad.
class FdStreamBuffer : public std::streambuf {
  public:
    explicit FdStreamBuffer(int fd, size_t capacity = 1 << 16);
    FdStreamBuffer(const FdStreamBuffer&) = delete;
    FdStreamBuffer& operator=(const FdStreamBuffer&) = delete;

    // The errno of the first failed write, 0 when every write so far succeeded.
    int Error() const { return error_; }
    // Writes what is buffered, then `count` blocks one after another, many to a system call
    // (a scene's hundreds of buffers otherwise cost a call each); false once anything failed.
    bool WriteGathered(const struct iovec* blocks, size_t count);

  protected:
    int_type overflow(int_type c) override;
    std::streamsize xsputn(const char* s, std::streamsize n) override;
    int sync() override;

  private:
    // Writes [data, data + size) in full, retrying short and interrupted writes.
    bool writeAll(const char* data, size_t size);
    bool drain();
    // Counts `n` more bytes written and, each kWritebackStep of them, sets the disk to work on
    // them while the rest is written, so that the flush at the end waits only for the last.
    void wrote(size_t n);

    static constexpr size_t kWritebackStep = size_t(4) << 20;

    int fd_;
    int error_ = 0;
    size_t written_ = 0;  // bytes written so far
    size_t started_ = 0;  // of them, those the disk was asked to write out
    std::vector<char> buffer_;
};
