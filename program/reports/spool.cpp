#include "program/reports/spool.h"

#include <fcntl.h>
#include <unistd.h>

#include <array>
#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <filesystem>
#include <system_error>

#include "program/commands/failure.h"

namespace ipmisel {
namespace {

[[noreturn]] void Fail(int error) {
    throw Failure(kExitUsage, std::string("cannot keep the report in a temporary file: ") +
                                  std::strerror(error) +
                                  "; make room there, or name another folder in TMPDIR");
}

}  // namespace

Spool::Spool() {
    std::error_code error;
    const auto folder = std::filesystem::temp_directory_path(error);
    std::string name = (folder / "ipmisel-XXXXXX").string();
    const int file = error ? -1 : mkostemp(name.data(), O_CLOEXEC);
    if (file >= 0) {
        unlink(name.c_str());
        file_.reset(fdopen(file, "w+"));
    }
    if (!file_) Fail(error ? error.value() : errno);
}

void Spool::Write(std::string_view text) {
    if (std::fwrite(text.data(), 1, text.size(), file_.get()) != text.size()) Fail(errno);
}

void Spool::Rewind() {
    if (std::fflush(file_.get()) != 0) Fail(errno);
    std::rewind(file_.get());
}

void Spool::CopyTo(OutputFile& out) {
    Rewind();
    std::array<char, 1 << 14> room;
    for (std::size_t n; (n = std::fread(room.data(), 1, room.size(), file_.get())) > 0;) {
        out.Write({room.data(), n});
    }
    if (std::ferror(file_.get()) != 0) Fail(errno);
}

void Spool::Append(std::string_view text) {
    const std::size_t length = text.size();
    Write({reinterpret_cast<const char*>(&length), sizeof length});
    Write(text);
}

bool Spool::Next(std::string* text) {
    std::size_t length = 0;
    if (std::fread(&length, sizeof length, 1, file_.get()) != 1) {
        if (std::ferror(file_.get()) != 0) Fail(errno);
        return false;
    }
    text->resize(length);
    if (std::fread(text->data(), 1, length, file_.get()) != length) Fail(errno);
    return true;
}

}  // namespace ipmisel
