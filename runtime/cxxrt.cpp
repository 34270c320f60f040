// The pieces of the C++ runtime library that the agent's library and slotwatch use, built into
// them so that they need none at run time (the 32-bit target's runtime is an older one than the
// compiler's): the string classes' out-of-line members, and the error helpers that the standard
// headers call where a build with exceptions would throw. Such an error is a fault of ours, never
// of the input, so it ends the process with one line on standard error.
#include <errno.h>

#include <cstdio>
#include <cstdlib>
#include <new>
#include <string>

template class std::basic_string<char>;
template class std::basic_string<wchar_t>;

namespace {

[[noreturn]] void Fatal(const char* what) noexcept {
    std::fprintf(stderr, "%s: internal error: %s\n", program_invocation_short_name,
                 what != nullptr ? what : "");
    std::abort();
}

}  // namespace

namespace std {

const nothrow_t nothrow{};

void __throw_bad_alloc() {
    Fatal("out of memory");
}
void __throw_bad_array_new_length() {
    Fatal("bad array length");
}
void __throw_logic_error(const char* what) {
    Fatal(what);
}
void __throw_invalid_argument(const char* what) {
    Fatal(what);
}
void __throw_length_error(const char* what) {
    Fatal(what);
}
void __throw_out_of_range(const char* what) {
    Fatal(what);
}
// The format's arguments are left out: the text names the member that failed.
void __throw_out_of_range_fmt(const char* what, ...) {
    Fatal(what);
}

}  // namespace std
