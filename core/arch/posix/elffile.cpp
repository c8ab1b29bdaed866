#include "core/arch/posix/elffile_p.h"

#include <elf.h>
#include <link.h>
#include <unistd.h>
#include <algorithm>
#include <cerrno>
#include <cstring>
#include <vector>

namespace {

using Head = ElfW(Ehdr);
using Segment = ElfW(Phdr);
using Section = ElfW(Shdr);

}  // namespace

// The header of the file that holds this code, put there by the linker: what it says of the machine is what
// another file has to say.
extern "C" const Head __ehdr_start __attribute__((visibility("hidden")));

namespace {

struct Reader {
    int descriptor;
    std::uint64_t size;

    bool holds(std::uint64_t offset, std::uint64_t bytes) const {
        return offset <= size && bytes <= size - offset;
    }
    template <class Record>
    bool read(std::uint64_t offset, Record& record) const {
        ssize_t got;
        do got = pread(descriptor, &record, sizeof record, static_cast<off_t>(offset));
        while (got < 0 && errno == EINTR);
        return got == static_cast<ssize_t>(sizeof record);
    }
    // A table, in one piece; empty if it can't be read. The caller bounds its size.
    template <class Record>
    std::vector<Record> table(std::uint64_t offset, std::uint64_t count) const {
        std::vector<Record> records(holds(offset, count * sizeof(Record)) ? count : 0);
        std::uint64_t done = 0;
        for (const std::uint64_t bytes = records.size() * sizeof(Record); done < bytes;) {
            auto* const to = reinterpret_cast<char*>(records.data()) + done;
            const ssize_t got = pread(descriptor, to, bytes - done, static_cast<off_t>(offset + done));
            if (got < 0 && errno == EINTR) continue;
            if (got <= 0) return {};
            done += static_cast<std::uint64_t>(got);
        }
        return records;
    }
    // All of a section; empty, too, if it is larger than that of any real library.
    template <class Record>
    std::vector<Record> contents(const Section& section) const {
        constexpr std::uint64_t most = std::uint64_t{64} << 20;
        if (section.sh_size > most) return {};
        return table<Record>(section.sh_offset, section.sh_size / sizeof(Record));
    }
    std::vector<Segment> segments(const Head& head) const {
        return table<Segment>(head.e_phoff, head.e_phnum);
    }
    std::vector<Section> sections(const Head& head) const {
        return table<Section>(head.e_shoff, head.e_shnum);
    }
    std::string incomplete() const {
        return "is incomplete: it ends after " + std::to_string(size) + " bytes";
    }
};

constexpr char noLibrary[] = "is not a shared library";
constexpr char unreadable[] = "can't be read";
constexpr char damaged[] = "has damaged headers";

bool isOfThisMachine(const Head& head) {
    return head.e_ident[EI_CLASS] == __ehdr_start.e_ident[EI_CLASS] &&
           head.e_ident[EI_DATA] == __ehdr_start.e_ident[EI_DATA] && head.e_machine == __ehdr_start.e_machine;
}

std::string segmentFault(const Reader& file, const Head& head) {
    if (head.e_phnum == 0) return noLibrary;
    if (head.e_phentsize != sizeof(Segment)) return damaged;
    if (!file.holds(head.e_phoff, std::uint64_t{head.e_phnum} * sizeof(Segment))) return file.incomplete();
    bool code = false, linkage = false;
    const std::vector<Segment> segments = file.segments(head);
    if (segments.empty()) return unreadable;
    for (const Segment& segment : segments) {
        if (!file.holds(segment.p_offset, segment.p_filesz)) return file.incomplete();
        if (segment.p_type == PT_LOAD && segment.p_filesz > segment.p_memsz) return damaged;
        code = code || segment.p_type == PT_LOAD;
        linkage = linkage || (segment.p_type == PT_DYNAMIC && segment.p_filesz >= sizeof(ElfW(Dyn)));
    }
    return code && linkage ? "" : noLibrary;
}

// The loader does not read sections, but their table is the last thing in a file: without it the end is
// missing.
std::string sectionFault(const Reader& file, const Head& head) {
    if (head.e_shoff == 0) return "";  // removed
    if (head.e_shnum != 0 && head.e_shentsize != sizeof(Section)) return damaged;
    if (!file.holds(head.e_shoff, std::uint64_t{head.e_shnum} * sizeof(Section))) return file.incomplete();
    const std::vector<Section> sections = file.sections(head);
    if (sections.size() != head.e_shnum) return unreadable;
    for (const Section& section : sections) {
        const bool inFile = section.sh_type != SHT_NOBITS && section.sh_type != SHT_NULL;
        if (inFile && !file.holds(section.sh_offset, section.sh_size)) return file.incomplete();
    }
    return "";
}

using Symbol = ElfW(Sym);

bool isNumber(const Symbol& symbol) {
    // The type has the same place in the records of both widths.
    return symbol.st_shndx != SHN_UNDEF && ELF64_ST_TYPE(symbol.st_info) == STT_OBJECT &&
           symbol.st_size >= sizeof(std::uint32_t);  // a sanitizer adds room of its own
}

bool isNamed(const Symbol& symbol, std::string_view name, const std::vector<char>& names) {
    if (symbol.st_name >= names.size() || names.size() - symbol.st_name <= name.size()) return false;
    const char* const own = &names[symbol.st_name];
    return name == std::string_view(own, name.size()) && own[name.size()] == '\0';
}

// What a library has at an address when it is loaded, before its code changes it.
std::optional<std::uint32_t> numberAt(const Reader& file, const Head& head, ElfW(Addr) address) {
    for (const Segment& segment : file.segments(head)) {
        const auto offset = address - segment.p_vaddr;
        std::uint32_t number = 0;
        if (segment.p_type != PT_LOAD || address < segment.p_vaddr || segment.p_filesz < sizeof number ||
            offset > segment.p_filesz - sizeof number)
            continue;
        if (file.read(segment.p_offset + offset, number)) return number;
    }
    return std::nullopt;
}

}  // namespace

std::optional<std::uint32_t> qvElfNumber(int descriptor, std::uint64_t size, std::string_view symbol) {
    const Reader file{descriptor, size};
    Head head{};
    if (!qvElfFault(descriptor, size).empty() || !file.read(0, head)) return std::nullopt;
    const std::vector<Section> sections = file.sections(head);
    // There is one; a file that has many is not made to be loaded.
    const auto exported = std::find_if(sections.begin(), sections.end(),
                                       [](const Section& section) { return section.sh_type == SHT_DYNSYM; });
    if (exported == sections.end() || exported->sh_link >= sections.size()) return std::nullopt;
    const std::vector<char> names = file.contents<char>(sections[exported->sh_link]);
    for (const Symbol& found : file.contents<Symbol>(*exported))
        if (isNumber(found) && isNamed(found, symbol, names)) return numberAt(file, head, found.st_value);
    return std::nullopt;
}

std::string qvElfFault(int descriptor, std::uint64_t size) {
    const Reader file{descriptor, size};
    if (size == 0) return "is empty";
    unsigned char magic[SELFMAG];
    if (!file.holds(0, sizeof magic)) return noLibrary;
    if (!file.read(0, magic)) return unreadable;
    if (std::memcmp(magic, ELFMAG, SELFMAG) != 0) return noLibrary;
    Head head{};
    if (!file.holds(0, sizeof head)) return file.incomplete();
    if (!file.read(0, head)) return unreadable;
    if (!isOfThisMachine(head)) return "is for another kind of machine";
    if (head.e_type == ET_EXEC) return "is a program and not a shared library";
    if (head.e_type != ET_DYN) return noLibrary;
    const std::string fault = segmentFault(file, head);
    return fault.empty() ? sectionFault(file, head) : fault;
}
