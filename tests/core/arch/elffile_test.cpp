#include "core/arch/posix/elffile_p.h"

#include <dlfcn.h>
#include <elf.h>
#include <link.h>
#include <sys/mman.h>
#include <unistd.h>

#include <cstddef>
#include <random>

#include "tests/support/checks.h"

namespace {

// A library that every machine has: that of the C runtime.
std::string library() {
    Dl_info facts{};
    dladdr(reinterpret_cast<const void*>(&std::strlen), &facts);
    return TempFolder::read(facts.dli_fname);
}

std::string faultOf(const std::string& bytes) {
    const int file = memfd_create("library", MFD_CLOEXEC);
    EXPECT_EQ(write(file, bytes.data(), bytes.size()), static_cast<ssize_t>(bytes.size()));
    const std::string fault = qvElfFault(file, bytes.size());
    close(file);
    return fault;
}

template <class Field>
std::string with(std::string bytes, std::size_t offset, Field value) {
    std::memcpy(&bytes[offset], &value, sizeof value);
    return bytes;
}

TEST(ElfFile, EveryCutIsFound) {
    const std::string whole = library();
    ASSERT_EQ(faultOf(whole), "");
    EXPECT_EQ(faultOf(""), "is empty");
    const int file = memfd_create("library", MFD_CLOEXEC);
    ASSERT_EQ(write(file, whole.data(), whole.size()), static_cast<ssize_t>(whole.size()));
    for (std::size_t size = whole.size() - 1; size > 3; size -= size > 8192 ? size / 9 : 1) {
        ASSERT_EQ(ftruncate(file, static_cast<off_t>(size)), 0);
        ASSERT_EQ(qvElfFault(file, size), "is incomplete: it ends after " + std::to_string(size) + " bytes");
    }
    close(file);
}

TEST(ElfFile, HeadersAreNotBelieved) {
    using Head = ElfW(Ehdr);
    using Segment = ElfW(Phdr);
    const std::string whole = library();
    Head head;
    std::memcpy(&head, whole.data(), sizeof head);
    const auto segment = [&](std::uint32_t type, std::size_t field) {
        for (std::size_t i = 0; i < head.e_phnum; ++i) {
            Segment found;
            std::memcpy(&found, &whole[head.e_phoff + i * sizeof found], sizeof found);
            if (found.p_type == type) return head.e_phoff + i * sizeof found + field;
        }
        return std::size_t{0};
    };
    constexpr auto huge = static_cast<decltype(Head::e_phoff)>(-8);
    const auto half = static_cast<std::uint16_t>(0xFFFF);
    const struct {
        std::string bytes, fault;
    } cases[] = {
        {"#!/bin/sh\nexit 0\n", "is not a shared library"},
        {"\x7F", "is not a shared library"},
        {with(whole, EI_CLASS, static_cast<char>(3 - whole[EI_CLASS])), "is for another kind of machine"},
        {with(whole, EI_DATA, static_cast<char>(3 - whole[EI_DATA])), "is for another kind of machine"},
        {with(whole, offsetof(Head, e_machine), std::uint16_t{EM_S390}), "is for another kind of machine"},
        {with(whole, offsetof(Head, e_type), std::uint16_t{ET_EXEC}),
         "is a program and not a shared library"},
        {with(whole, offsetof(Head, e_type), std::uint16_t{ET_REL}), "is not a shared library"},
        {with(whole, offsetof(Head, e_phnum), std::uint16_t{0}), "is not a shared library"},
        {with(whole, offsetof(Head, e_phentsize), std::uint16_t{1}), "has damaged headers"},
        {with(whole, offsetof(Head, e_phoff), huge), "is incomplete"},
        {with(whole, offsetof(Head, e_shoff), huge), "is incomplete"},
        {with(whole, offsetof(Head, e_shentsize), half), "has damaged headers"},
        {with(whole, segment(PT_LOAD, offsetof(Segment, p_filesz)), huge), "is incomplete"},
        {with(whole, segment(PT_LOAD, offsetof(Segment, p_offset)), huge), "is incomplete"},
        {with(whole, segment(PT_LOAD, offsetof(Segment, p_memsz)), decltype(Segment::p_memsz){0}),
         "has damaged headers"},
        {with(whole, segment(PT_DYNAMIC, 0), std::uint32_t{PT_NULL}), "is not a shared library"},
        {with(whole, segment(PT_DYNAMIC, offsetof(Segment, p_filesz)), decltype(Segment::p_filesz){8}),
         "is not a shared library"},
    };
    for (const auto& c : cases) EXPECT_EQ(faultOf(c.bytes).substr(0, c.fault.size()), c.fault) << &c - cases;
    // No sections at all: some tools remove them.
    EXPECT_EQ(faultOf(with(with(whole, offsetof(Head, e_shoff), decltype(Head::e_shoff){0}),
                           offsetof(Head, e_shnum), std::uint16_t{0})),
              "");
    // Bytes that nobody would think of, in the headers and in the list of sections: the check may find them
    // good or bad, but it ends.
    const int file = memfd_create("library", MFD_CLOEXEC);
    ASSERT_EQ(write(file, whole.data(), whole.size()), static_cast<ssize_t>(whole.size()));
    std::mt19937 random(1);
    for (int i = 0; i < 300; ++i) {
        const std::size_t place = i % 2 ? sizeof(Head) + random() % 900 : head.e_shoff + random() % 4000;
        const std::uint64_t noise = random() % 3 ? random() : ~std::uint64_t{0} - random() % 4096;
        pwrite(file, &noise, 4 + random() % 5, static_cast<off_t>(std::min(place, whole.size() - 8)));
        qvElfNumber(file, whole.size(), "environ");
        if (i % 4 == 3) pwrite(file, whole.data(), whole.size(), 0);
    }
    close(file);
}

}  // namespace
