// SPDX-License-Identifier: Apache-2.0
#pragma once

#include <cstdio>
#include <stdexcept>
#include <string>
#include <unistd.h>

// Collects what the process writes to standard output (file descriptor 1) while it lives. One at a time.
class StdoutCapture {
public:
    StdoutCapture()
        : file_(std::tmpfile()) {
        std::fflush(stdout);
        saved_ = file_ ? dup(STDOUT_FILENO) : -1;
        if (saved_ < 0 || dup2(fileno(file_), STDOUT_FILENO) < 0)
            throw std::runtime_error("standard output cannot be redirected");
    }
    ~StdoutCapture() { finish(); }
    StdoutCapture(const StdoutCapture&) = delete;
    StdoutCapture& operator=(const StdoutCapture&) = delete;

    // Ends the capture and gives what was written.
    std::string take() {
        finish();
        return text_;
    }

private:
    void finish() {
        if (!file_)
            return;
        std::fflush(stdout);
        dup2(saved_, STDOUT_FILENO);
        close(saved_);
        std::rewind(file_);
        for (int c = std::fgetc(file_); c != EOF; c = std::fgetc(file_))
            text_.push_back(static_cast<char>(c));
        std::fclose(file_);
        file_ = nullptr;
    }

    std::FILE* file_;
    int saved_ = -1;
    std::string text_;
};
