// SPDX-License-Identifier: Apache-2.0
// What the C++ library of WebAssembly leaves open. Its exceptions cannot be caught: a throw keeps its text and traps,
// which the page catches. Nothing is imported, so that there is no clock either.
#include "lastError.h"

#include <array>
#include <cstdlib>
#include <cstring>
#include <ctime>
#include <exception>
#include <new>
#include <typeinfo>

namespace {

std::array<char, 512> errorText{};

[[noreturn]] void trap() {
    __builtin_trap();
}

[[noreturn]] void trapWith(const char* text) {
    viewer::keepError(text);
    trap();
}

} // namespace

void viewer::keepError(const char* text) noexcept {
    std::strncpy(errorText.data(), text, errorText.size() - 1);
}

const char* viewer::lastError() noexcept {
    return errorText.data();
}

// The part of the library's type information that a handler asks whether it catches (Itanium C++ ABI, 2.9.5; the names
// and the order of the virtual functions are those of LLVM's libc++abi).
namespace __cxxabiv1 {

class __shim_type_info : public std::type_info { // NOLINT(bugprone-reserved-identifier): the library's own name
public:
    ~__shim_type_info() override;
    virtual void noop1() const;
    virtual void noop2() const;
    virtual bool can_catch(const __shim_type_info* thrown, void*& object) const = 0;
};

} // namespace __cxxabiv1

extern "C" {

// NOLINTBEGIN(bugprone-reserved-identifier): names of the ABI
void* __cxa_allocate_exception(std::size_t size) {
    void* const memory = std::malloc(size);
    return memory ? memory : (trapWith("out of memory"), nullptr);
}

void __cxa_throw(void* thrown, std::type_info* type, void (*)(void*)) {
    using Info = const __cxxabiv1::__shim_type_info*;
    void* object = thrown;
    if (static_cast<Info>(&typeid(std::exception))->can_catch(static_cast<Info>(type), object))
        trapWith(static_cast<const std::exception*>(object)->what());
    trapWith("an exception of a kind of its own");
}

void __cxa_free_exception(void*) {}
void* __cxa_begin_catch(void*) {
    trap();
}
void __cxa_end_catch() {
    trap();
}
void __cxa_rethrow() {
    trap();
}
// NOLINTEND(bugprone-reserved-identifier)

/// The library's own prints to a file, which a page has not.
[[noreturn]] void abort_message(const char* format, ...) {
    trapWith(format);
}

/// The only user is the text of a singular matrix, which no page shows; numbers in it would cost a quarter of the core.
int snprintf(char* text, std::size_t size, const char* format, ...) {
    std::strncpy(text, format, size);
    text[size - 1] = '\0';
    return static_cast<int>(std::strlen(format));
}

int clock_gettime(clockid_t, struct timespec* time) {
    *time = {};
    return 0;
}

} // extern "C"

// those of the library give null where there is no memory, which is an address like any other here
void* operator new(std::size_t size) {
    void* const memory = std::malloc(size == 0 ? 1 : size);
    if (!memory)
        trapWith("out of memory");
    return memory;
}

void operator delete(void* memory) noexcept {
    std::free(memory);
}

void operator delete(void* memory, std::size_t) noexcept {
    std::free(memory);
}
