#include "host/shared_object_check.h"

#include <elf.h>
#include <fcntl.h>
#include <link.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstdint>
#include <cstring>
#include <vector>

namespace xtok::host {

namespace {

using Ehdr = ElfW(Ehdr);
using Phdr = ElfW(Phdr);
using Shdr = ElfW(Shdr);

#if defined(__x86_64__)
constexpr uint16_t kMachine = EM_X86_64;
#elif defined(__i386__)
constexpr uint16_t kMachine = EM_386;
#elif defined(__aarch64__)
constexpr uint16_t kMachine = EM_AARCH64;
#elif defined(__arm__)
constexpr uint16_t kMachine = EM_ARM;
#else
constexpr uint16_t kMachine = EM_NONE;  // left to dlopen
#endif
constexpr unsigned char kClass = sizeof(void*) == 8 ? ELFCLASS64 : ELFCLASS32;
constexpr unsigned char kData =
    __BYTE_ORDER__ == __ORDER_LITTLE_ENDIAN__ ? ELFDATA2LSB : ELFDATA2MSB;

struct MachineName {
    uint16_t machine;
    const char* bits32;
    const char* bits64;
};

constexpr MachineName kMachineNames[] = {
    {EM_X86_64, "x86-64 32-bit (x32)", "x86-64"},
    {EM_386, "x86 32-bit", "x86 64-bit"},
    {EM_ARM, "ARM 32-bit", "ARM 64-bit"},
    {EM_AARCH64, "ARM 64-bit (ILP32)", "ARM 64-bit"},
    {EM_RISCV, "RISC-V 32-bit", "RISC-V 64-bit"},
    {EM_PPC, "PowerPC 32-bit", "PowerPC 64-bit"},
    {EM_PPC64, "PowerPC 64-bit (32-bit file)", "PowerPC 64-bit"},
    {EM_MIPS, "MIPS 32-bit", "MIPS 64-bit"},
};

std::string machineText(uint16_t machine, unsigned char elfClass, unsigned char data) {
    const bool wide = elfClass == ELFCLASS64;
    std::string text = "machine type " + std::to_string(machine) + (wide ? " 64-bit" : " 32-bit");
    for (const MachineName& name : kMachineNames) {
        if (name.machine == machine) {
            text = wide ? name.bits64 : name.bits32;
        }
    }
    if (data != kData) {
        text += data == ELFDATA2MSB ? ", big-endian" : ", little-endian";
    }
    return text;
}

bool within(uint64_t offset, uint64_t length, uint64_t size) {
    return offset <= size && length <= size - offset;
}

/// `count` records of `entry` bytes at `offset`, after checking that they
/// lie in the file.
template <class Record>
bool readTable(int fd, uint64_t offset, uint64_t count, uint64_t entry, uint64_t size,
               std::vector<Record>& records) {
    if (count > 0 && entry != sizeof(Record)) {
        return false;
    }
    if (!within(offset, count * sizeof(Record), size)) {
        return false;
    }
    records.resize(count);
    const std::size_t bytes = count * sizeof(Record);
    return bytes == 0 || ::pread(fd, records.data(), bytes, static_cast<off_t>(offset)) ==
                             static_cast<ssize_t>(bytes);
}

/// What of the file's layout lies past its end, or "".
std::string cutPart(int fd, const Ehdr& header, uint64_t size) {
    std::vector<Phdr> segments;
    if (!readTable(fd, header.e_phoff, header.e_phnum, header.e_phentsize, size, segments)) {
        return "program headers";
    }
    for (const Phdr& segment : segments) {
        if (!within(segment.p_offset, segment.p_filesz, size)) {
            return "segments";
        }
    }
    std::vector<Shdr> sections;
    if (header.e_shoff != 0 &&
        !readTable(fd, header.e_shoff, header.e_shnum, header.e_shentsize, size, sections)) {
        return "section headers";
    }
    for (const Shdr& section : sections) {
        if (section.sh_type != SHT_NOBITS && !within(section.sh_offset, section.sh_size, size)) {
            return "sections";
        }
    }
    return "";
}

/// e_machine sits at the same place for both word sizes, in the file's byte order.
uint16_t fileMachine(const unsigned char* head, unsigned char data) {
    const unsigned first = head[EI_NIDENT + 2], second = head[EI_NIDENT + 3];
    return static_cast<uint16_t>(data == ELFDATA2MSB ? first << 8 | second : second << 8 | first);
}

std::string truncated(const std::string& path, const std::string& what, uint64_t size) {
    return path + " is truncated or damaged (" + std::to_string(size) + " bytes): " + what;
}

std::string elfProblem(int fd, const std::string& path, uint64_t size) {
    unsigned char head[sizeof(Ehdr)] = {};
    const ssize_t got = ::pread(fd, head, sizeof head, 0);
    if (got < SELFMAG || std::memcmp(head, ELFMAG, SELFMAG) != 0) {
        return path + " is not a shared object";
    }
    if (got < EI_NIDENT + 4) {
        return truncated(path, "its ELF header is cut off", size);
    }
    const unsigned char elfClass = head[EI_CLASS], data = head[EI_DATA];
    const uint16_t machine = fileMachine(head, data);
    if (kMachine != EM_NONE && (machine != kMachine || elfClass != kClass || data != kData)) {
        return path + " is built for " + machineText(machine, elfClass, data) +
               ", this machine is " + machineText(kMachine, kClass, kData);
    }
    if (got < static_cast<ssize_t>(sizeof head)) {
        return truncated(path, "its ELF header is cut off", size);
    }
    Ehdr header;
    std::memcpy(&header, head, sizeof header);
    if (header.e_type != ET_DYN) {
        return path + " is not a shared object";
    }
    const std::string cut = cutPart(fd, header, size);
    return cut.empty() ? "" : truncated(path, "its " + cut + " reach past its end", size);
}

}  // namespace

// stat first: opening a FIFO or a device to look at it could block or act.
std::string sharedObjectProblem(const std::string& path) {
    struct stat info;
    if (::stat(path.c_str(), &info) != 0) {
        return "plug-in " + path + " not found: " + std::strerror(errno);
    }
    if (!S_ISREG(info.st_mode)) {
        return path + " is not a shared object";
    }
    const int fd = ::open(path.c_str(), O_RDONLY | O_NONBLOCK | O_NOCTTY | O_CLOEXEC);
    if (fd < 0) {
        return "cannot read " + path + ": " + std::strerror(errno);
    }
    std::string problem = ::fstat(fd, &info) == 0 && S_ISREG(info.st_mode)
                              ? elfProblem(fd, path, static_cast<uint64_t>(info.st_size))
                              : path + " is not a shared object";
    ::close(fd);
    return problem;
}

}  // namespace xtok::host
