// write(2) of the same bytes, formatted in advance: the least that the system calls cost. The file
// rotates like the others', so that the disk load is the same. The descriptor's number never
// changes, and no lock is taken for a line.

#include <fcntl.h>
#include <unistd.h>

#include <atomic>
#include <cstdio>

#include "LogPeer.h"

namespace {

class BareWrite : public bench::LogPeer {
public:
    void open(const std::string& directory, bench::Layout layout) override {
        _path = directory + "/bench.log";
        _fd = openFile();
        _size = ::lseek(_fd, 0, SEEK_END);
        _line = "request 1234567 of client " QUELTA_BENCH_CLIENT " served in " +
                std::to_string(bench::BENCH_MILLISECONDS) + " ms\n";
        if (layout == bench::Layout::DATE) {
            _line = "12-31-2025 23:59:59.999 INFO  bench - " + _line;
        }
    }

    void lines(std::size_t, std::size_t count) override {
        const long length = static_cast<long>(_line.size());
        for (; count > 0; --count) {
            if (::write(_fd, _line.data(), _line.size()) != length) {
                std::perror("write");
            }
            const long size = _size.fetch_add(length, std::memory_order_relaxed) + length;
            // Only the line that crosses the limit rotates the file.
            if (size > bench::ROTATE_BYTES && size - length <= bench::ROTATE_BYTES) {
                rotate();
            }
        }
    }

    bool suppressed(std::size_t) override { return false; }
    void close() override { ::close(_fd); }

private:
    int openFile() const {
        return ::open(_path.c_str(), O_WRONLY | O_CREAT | O_APPEND | O_CLOEXEC, 0644);
    }

    void rotate() {
        for (int i = bench::BACKUPS - 1; i >= 0; --i) {
            const std::string from = i == 0 ? _path : _path + '.' + std::to_string(i);
            ::rename(from.c_str(), (_path + '.' + std::to_string(i + 1)).c_str());
        }
        const int next = openFile();
        ::dup2(next, _fd);
        ::close(next);
        _size = 0;
    }

    std::string _path;
    std::string _line;
    int _fd = -1;
    std::atomic<long> _size{0};
};

const bench::LogRegistrar<BareWrite> peer("bare write");

}  // namespace
