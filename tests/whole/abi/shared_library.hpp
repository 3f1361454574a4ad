// Reads a shared library's file: what it exports and needs, and what is left to the loader.
#pragma once

#include <algorithm>
#include <cstring>
#include <fstream>
#include <iterator>
#include <map>
#include <set>
#include <stdexcept>
#include <string>
#include <utility>
#include <vector>

#include <elf.h>
#include <link.h>

namespace kz::test {

using Names = std::set<std::string>;

inline std::string text_of(const std::string& path)
{
    std::ifstream in(path, std::ios::binary);
    if (!in) {
        throw std::runtime_error("cannot read " + path);
    }
    return {std::istreambuf_iterator<char>(in), {}};
}

struct Export {
    std::string name;
    unsigned type;
    std::string version;
};

/// The parts of an ELF file that are needed here.
class SharedLibrary {
public:
    explicit SharedLibrary(const std::string& path) : bytes_(text_of(path))
    {
        const auto header = at<ElfW(Ehdr)>(0);
        for (unsigned i = 0; i < header.e_shnum; ++i) {
            sections_.push_back(at<ElfW(Shdr)>(header.e_shoff + i * header.e_shentsize));
        }
    }

    /// Every symbol that others can bind to. The names of the versions themselves are absolute
    /// ones.
    std::vector<Export> exports() const
    {
        std::vector<Export> found;
        const auto names = names_of_versions();
        const auto versions = entries<ElfW(Half)>(SHT_GNU_versym);
        const auto symbols = dynamic_symbols();
        for (size_t i = 0; i < symbols.size(); ++i) {
            const auto& [name, symbol] = symbols[i];
            if (!name.empty() && symbol.st_shndx != SHN_UNDEF && symbol.st_shndx != SHN_ABS) {
                const auto version = i < versions.size() ? versions[i] & 0x7fff : 0;
                found.push_back({name, static_cast<unsigned>(ELF64_ST_TYPE(symbol.st_info)),
                                 names.contains(version) ? names.at(version) : ""});
            }
        }
        return found;
    }

    /// The names of our own that the loader looks up for us, in whatever defines them first.
    Names own_names_looked_up() const
    {
        Names found;
        const auto symbols = dynamic_symbols();
        const auto add = [&](const auto& relocation) {
            const auto& [name, symbol] = symbols.at(symbol_of(relocation.r_info));
            if (!name.empty() && symbol.st_shndx != SHN_UNDEF) {
                found.insert(name);
            }
        };
        std::ranges::for_each(entries<ElfW(Rela)>(SHT_RELA), add);
        std::ranges::for_each(entries<ElfW(Rel)>(SHT_REL), add);
        return found;
    }

    std::vector<ElfW(Phdr)> loaded_segments() const
    {
        const auto header = at<ElfW(Ehdr)>(0);
        std::vector<ElfW(Phdr)> found;
        for (unsigned i = 0; i < header.e_phnum; ++i) {
            const auto segment = at<ElfW(Phdr)>(header.e_phoff + i * header.e_phentsize);
            if (segment.p_type == PT_LOAD) {
                found.push_back(segment);
            }
        }
        return found;
    }

    Names dynamic_texts(ElfW(Sxword) tag) const
    {
        Names found;
        for_each<ElfW(Dyn)>(SHT_DYNAMIC, [&](const ElfW(Dyn) & entry, const ElfW(Shdr) & strings) {
            if (entry.d_tag == tag) {
                found.insert(text(strings, entry.d_un.d_val));
            }
        });
        return found;
    }

private:
    template <class T>
    T at(size_t offset) const
    {
        T value{};
        std::memcpy(&value, bytes_.substr(offset, sizeof value).data(), sizeof value);
        return value;
    }

    template <class Entry, class Visit>
    void for_each(unsigned type, Visit visit) const
    {
        for (const auto& section : sections_) {
            for (size_t at_byte = 0; section.sh_type == type && at_byte < section.sh_size;
                 at_byte += sizeof(Entry)) {
                visit(at<Entry>(section.sh_offset + at_byte), sections_.at(section.sh_link));
            }
        }
    }

    template <class Entry>
    std::vector<Entry> entries(unsigned type) const
    {
        std::vector<Entry> found;
        for_each<Entry>(type,
                        [&](const Entry& entry, const ElfW(Shdr)&) { found.push_back(entry); });
        return found;
    }

    std::vector<std::pair<std::string, ElfW(Sym)>> dynamic_symbols() const
    {
        std::vector<std::pair<std::string, ElfW(Sym)>> found;
        for_each<ElfW(Sym)>(SHT_DYNSYM, [&](const ElfW(Sym) & symbol, const ElfW(Shdr) & strings) {
            found.emplace_back(text(strings, symbol.st_name), symbol);
        });
        return found;
    }

    /// The versions that the library defines, by the number that its symbols bear.
    std::map<int, std::string> names_of_versions() const
    {
        std::map<int, std::string> found;
        for (const auto& section : sections_) {
            size_t offset = section.sh_offset;
            for (unsigned i = 0; section.sh_type == SHT_GNU_verdef && i < section.sh_info; ++i) {
                const auto version = at<ElfW(Verdef)>(offset);
                const auto name = at<ElfW(Verdaux)>(offset + version.vd_aux).vda_name;
                found[version.vd_ndx] = text(sections_.at(section.sh_link), name);
                offset += version.vd_next;
            }
        }
        return found;
    }

    /// A relocation's number holds the symbol's above its type.
    static size_t symbol_of(ElfW(Xword) info) { return info >> (sizeof(void*) == 8 ? 32 : 8); }

    std::string text(const ElfW(Shdr) & strings, size_t offset) const
    {
        return bytes_.c_str() + strings.sh_offset + offset;
    }

    std::string bytes_;
    std::vector<ElfW(Shdr)> sections_;
};

} // namespace kz::test
