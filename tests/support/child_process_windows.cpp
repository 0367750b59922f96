// RunChild on Windows: CreateProcessW with a command line quoted so that the
// child's CommandLineToArgvW gives `args` back unchanged.
#include "support/child_process.h"

#include <windows.h>

#include <thread>

namespace orvane::testing {
namespace {

// The tests write their arguments as UTF-8; the child sees UTF-16.
std::wstring Wide(const std::string &text) {
  if (text.empty()) return {};
  const int size = ::MultiByteToWideChar(CP_UTF8, 0, text.data(), static_cast<int>(text.size()),
                                         nullptr, 0);
  std::wstring wide(static_cast<std::size_t>(size), L'\0');
  ::MultiByteToWideChar(CP_UTF8, 0, text.data(), static_cast<int>(text.size()), wide.data(), size);
  return wide;
}

// Quotes one argument by the rules CommandLineToArgvW reads: backslashes are
// literal unless they precede a quote, where each counts double.
void AppendQuoted(std::wstring &line, const std::wstring &arg) {
  if (!line.empty()) line += L' ';
  if (!arg.empty() && arg.find_first_of(L" \t\n\v\"") == std::wstring::npos) {
    line += arg;
    return;
  }
  line += L'"';
  std::size_t backslashes = 0;
  for (wchar_t c : arg) {
    if (c == L'\\') {
      ++backslashes;
      continue;
    }
    if (c == L'"') backslashes = backslashes * 2 + 1;
    line.append(backslashes, L'\\');
    backslashes = 0;
    line += c;
  }
  line.append(backslashes * 2, L'\\');
  line += L'"';
}

// The current environment with `env` put over it, as a block of
// "NAME=value\0" entries ended by an empty one.
std::wstring EnvironmentBlock(const std::vector<std::pair<std::string, std::string>> &env) {
  std::wstring block;
  wchar_t *current = ::GetEnvironmentStringsW();
  for (const wchar_t *entry = current; *entry != L'\0'; entry += std::wcslen(entry) + 1) {
    const std::wstring text = entry;
    bool replaced = false;
    for (const auto &[name, value] : env)
      if (::CompareStringOrdinal(text.c_str(), static_cast<int>(name.size() + 1),
                                 (Wide(name) + L"=").c_str(), -1, TRUE) == CSTR_EQUAL)
        replaced = true;
    if (!replaced) block += text + L'\0';
  }
  ::FreeEnvironmentStringsW(current);
  for (const auto &[name, value] : env) block += Wide(name) + L"=" + Wide(value) + L'\0';
  block += L'\0';
  return block;
}

} // namespace

ChildResult RunChild(const std::string &program, const std::vector<std::string> &args,
                     const std::vector<std::pair<std::string, std::string>> &env,
                     int timeout_seconds) {
  ChildResult result;
  SECURITY_ATTRIBUTES inherit{sizeof inherit, nullptr, TRUE};
  HANDLE read_end = nullptr, write_end = nullptr;
  if (!::CreatePipe(&read_end, &write_end, &inherit, 0)) return result;
  ::SetHandleInformation(read_end, HANDLE_FLAG_INHERIT, 0);

  std::wstring line;
  for (const std::string &arg : args) AppendQuoted(line, Wide(arg));
  std::wstring environment = EnvironmentBlock(env);
  STARTUPINFOW startup{};
  startup.cb = sizeof startup;
  startup.dwFlags = STARTF_USESTDHANDLES;
  startup.hStdInput = ::GetStdHandle(STD_INPUT_HANDLE);
  startup.hStdOutput = write_end;
  startup.hStdError = write_end;
  PROCESS_INFORMATION child{};
  const BOOL started =
      ::CreateProcessW(Wide(program).c_str(), line.data(), nullptr, nullptr, TRUE,
                       CREATE_UNICODE_ENVIRONMENT, environment.data(), nullptr, &startup, &child);
  ::CloseHandle(write_end);
  if (!started) {
    ::CloseHandle(read_end);
    return result;
  }

  // The pipe is drained on its own thread so that a child that prints more
  // than the pipe holds cannot stall while this thread waits for its exit.
  std::thread reader([&] {
    char buffer[4096];
    DWORD n = 0;
    while (::ReadFile(read_end, buffer, sizeof buffer, &n, nullptr) && n > 0)
      result.output.append(buffer, n);
  });
  if (::WaitForSingleObject(child.hProcess, static_cast<DWORD>(timeout_seconds) * 1000) !=
      WAIT_OBJECT_0) {
    ::TerminateProcess(child.hProcess, 1);
    ::WaitForSingleObject(child.hProcess, INFINITE);
  } else {
    DWORD code = 0;
    if (::GetExitCodeProcess(child.hProcess, &code)) result.exit_code = static_cast<int>(code);
  }
  reader.join();
  ::CloseHandle(read_end);
  ::CloseHandle(child.hThread);
  ::CloseHandle(child.hProcess);
  return result;
}

} // namespace orvane::testing
