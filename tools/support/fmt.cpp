// Compiles fmt once. Debian has it only as a shared library or as headers, and the tools must not
// need another library at run time.

#include <fmt/format-inl.h>

// The headers declare these as instantiated elsewhere.
template auto fmt::detail::thousands_sep_impl<char>(fmt::detail::locale_ref)
    -> fmt::detail::thousands_sep_result<char>;
template auto fmt::detail::decimal_point_impl<char>(fmt::detail::locale_ref) -> char;
