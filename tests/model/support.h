// What the model tests share: captured standard output, and files that go away again.
#pragma once

#include <cstdio>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <stdexcept>
#include <string>
#include <string_view>

#include <unistd.h>

/// Redirects the process's standard output into a file until text() or destruction.
class StdoutCapture {
public:
    StdoutCapture() : saved_((std::fflush(stdout), dup(STDOUT_FILENO))), file_(std::tmpfile()) {
        if (file_ == nullptr || dup2(fileno(file_), STDOUT_FILENO) < 0) {
            throw std::runtime_error("cannot redirect standard output");
        }
    }
    ~StdoutCapture() {
        restore();
        std::fclose(file_);
    }
    StdoutCapture(const StdoutCapture&) = delete;
    StdoutCapture& operator=(const StdoutCapture&) = delete;

    /// Ends the capture and returns all that was written.
    std::string text() {
        restore();
        std::string text;
        std::rewind(file_);
        for (int c = std::fgetc(file_); c != EOF; c = std::fgetc(file_)) {
            text.push_back(static_cast<char>(c));
        }
        return text;
    }

private:
    void restore() {
        if (saved_ >= 0) {
            std::fflush(stdout);
            dup2(saved_, STDOUT_FILENO);
            close(saved_);
            saved_ = -1;
        }
    }

    int saved_;
    std::FILE* file_;
};

/// A fresh folder that is removed with everything in it.
class TempFolder {
public:
    TempFolder() {
        std::string name = (std::filesystem::temp_directory_path() / "nw_model_XXXXXX").string();
        if (mkdtemp(name.data()) == nullptr) {
            throw std::runtime_error("cannot make " + name);
        }
        path_ = name;
    }
    ~TempFolder() { std::filesystem::remove_all(path_); }
    TempFolder(const TempFolder&) = delete;
    TempFolder& operator=(const TempFolder&) = delete;

    std::filesystem::path operator/(const std::filesystem::path& name) const { return path_ / name; }

    /// Writes a file in the folder and returns its path.
    std::filesystem::path write(const std::filesystem::path& name, std::string_view bytes) const {
        std::ofstream(path_ / name, std::ios::binary) << bytes;
        return path_ / name;
    }

private:
    std::filesystem::path path_;
};

/// A network file of tests/models, by its name without extension.
inline std::filesystem::path testModel(const std::string& name) {
    return std::filesystem::path(NW_TEST_MODELS) / (name + ".onnx");
}
