// UTF-8 names as UTF-16, and the form for long paths: a prefix that turns off the system's own reading of the name, so
// the whole path is made first.
#include "platform/windows/wide_name.h"

#include <cerrno>

#include "platform/windows/system.h"

namespace {

// Folders are limited to 248 characters, so that a file name of the old kind fits in; files to 260.
constexpr DWORD kLongPath = 248;

std::wstring ToWide(const char* name) {
    const int length = MultiByteToWideChar(CP_UTF8, MB_ERR_INVALID_CHARS, name, -1, nullptr, 0);
    if (length <= 0) return {};
    std::wstring wide(static_cast<std::size_t>(length), L'\0');
    MultiByteToWideChar(CP_UTF8, MB_ERR_INVALID_CHARS, name, -1, wide.data(), length);
    wide.pop_back();  // the null
    return wide;
}

// The whole path of `name`, or nothing if the system can't make it.
std::wstring WholePath(const std::wstring& name) {
    const DWORD length = GetFullPathNameW(name.c_str(), 0, nullptr, nullptr);
    std::wstring path(length, L'\0');
    const DWORD written = GetFullPathNameW(name.c_str(), length, path.data(), nullptr);
    path.resize(written < length ? written : 0);
    return path;
}

}  // namespace

std::wstring WideName(const char* name) {
    std::wstring wide = ToWide(name);
    if (wide.empty()) {
        errno = *name == '\0' ? ENOENT : EILSEQ;
        return wide;
    }
    const std::wstring path = WholePath(wide);
    if (path.size() < kLongPath || path.compare(0, 4, L"\\\\?\\") == 0 || path.compare(0, 4, L"\\\\.\\") == 0)
        return wide;
    return path.compare(0, 2, L"\\\\") == 0 ? L"\\\\?\\UNC" + path.substr(1) : L"\\\\?\\" + path;
}
