// SPDX-License-Identifier: Apache-2.0
#include "gpu/kernelSource.h"

#include "storage/FileError.h"
#include "storage/readWholeFile.h"

#include <algorithm>
#include <set>
#include <sstream>
#include <stdexcept>
#include <string_view>
#include <utility>

#include <sys/stat.h>

namespace OpenQuarn {
namespace {

std::string readFile(const std::string& path) {
    constexpr std::uint64_t largest = std::uint64_t{16} << 20U;
    try {
        return storage::readWholeFile(path, largest);
    } catch (const storage::FileError& error) {
        throw std::runtime_error("cannot read the kernel file \"" + path + "\": it " + error.predicate());
    }
}

std::string folderOf(const std::string& path) {
    const std::size_t slash = path.rfind('/');
    return slash == std::string::npos ? "." : path.substr(0, slash);
}

std::string_view withoutBlanks(std::string_view text) {
    text.remove_prefix(std::min(text.find_first_not_of(" \t"), text.size()));
    return text;
}

bool skipWord(std::string_view& text, std::string_view word) {
    text = withoutBlanks(text);
    if (!text.starts_with(word))
        return false;
    text = withoutBlanks(text.substr(word.size()));
    return true;
}

// the name that a line includes; empty when it does not
std::string_view includedName(std::string_view line) {
    if (!skipWord(line, "#") || !skipWord(line, "include") || line.empty())
        return {};
    const char close = line.front() == '"' ? '"' : line.front() == '<' ? '>' : '\0';
    const std::size_t end = line.find(close, 1);
    return close == '\0' || end == std::string_view::npos ? std::string_view{} : line.substr(1, end - 1);
}

bool isPragmaOnce(std::string_view line) {
    return skipWord(line, "#") && skipWord(line, "pragma") && skipWord(line, "once");
}

class Reader {
public:
    explicit Reader(const std::vector<std::string>& folders)
        : folders_(folders) {}

    void read(const std::string& path) {
        source_.stamps.push_back(stampOf(path));
        open_.insert(path);
        std::istringstream lines(readFile(path));
        mark(1, path);
        std::string line;
        for (std::size_t number = 1; std::getline(lines, line); ++number)
            add(line, number, path);
        open_.erase(path);
    }
    KernelSource take() { return std::move(source_); }

private:
    void mark(std::size_t line, const std::string& path) {
        source_.text.append("#line ").append(std::to_string(line)).append(" \"");
        for (const char letter : path)
            source_.text.append(letter == '"' || letter == '\\' ? "\\" : "") += letter;
        source_.text.append("\"\n");
    }

    void add(std::string_view line, std::size_t number, const std::string& path) {
        const std::string_view name = includedName(line);
        const std::string found = name.empty() ? std::string() : find(name, path);
        if (isPragmaOnce(line))
            once_.insert(path);
        else if (found.empty())
            source_.text.append(line);
        else if (!open_.contains(found) && !once_.contains(found)) {
            read(found);
            mark(number + 1, path);
            return;
        }
        source_.text += '\n';
    }

    std::string find(std::string_view name, const std::string& includer) {
        std::vector<std::string> candidates = {name.starts_with('/') ? std::string() : folderOf(includer) + '/'};
        for (const std::string& folder : folders_)
            candidates.push_back(folder + '/');
        for (std::string& candidate : candidates) {
            candidate += name;
            FileStamp stamp = stampOf(candidate);
            if (stamp.size >= 0)
                return candidate;
            source_.stamps.push_back(std::move(stamp));
        }
        return {};
    }

    const std::vector<std::string>& folders_;
    KernelSource source_;
    std::set<std::string, std::less<>> open_, once_;
};

} // namespace

FileStamp stampOf(const std::string& path) {
    struct stat about = {};
    FileStamp stamp;
    stamp.path = path;
    if (::stat(path.c_str(), &about) == 0 && S_ISREG(about.st_mode)) {
        stamp.seconds = about.st_mtim.tv_sec;
        stamp.nanoseconds = about.st_mtim.tv_nsec;
        stamp.size = about.st_size;
    }
    return stamp;
}

KernelSource readKernelSource(const std::string& file, const std::vector<std::string>& folders) {
    Reader reader(folders);
    reader.read(file);
    return reader.take();
}

} // namespace OpenQuarn
