// SPDX-License-Identifier: Apache-2.0
#include "nw_deform/deformCharacters.h"

#include "quill/parallelFor.h"

#include <exception>
#include <stdexcept>
#include <string>
#include <unordered_map>
#include <vector>

namespace neuralWarp {
namespace {

void checkDifferent(std::span<const CharacterFrame> characters) {
    std::unordered_map<const Deformer*, std::size_t> places;
    for (std::size_t i = 0; i < characters.size(); ++i)
        if (const auto [found, isNew] = places.emplace(characters[i].deformer, i); !isNew)
            throw std::invalid_argument("deformers: character " + std::to_string(i) +
                                        " has the deformer of character " + std::to_string(found->second));
}

void throwFirst(const std::vector<std::exception_ptr>& failures) {
    for (std::size_t i = 0; i < failures.size(); ++i) {
        if (!failures[i])
            continue;
        try {
            std::rethrow_exception(failures[i]);
        } catch (const std::invalid_argument& error) {
            throw std::invalid_argument("character " + std::to_string(i) + ": " + error.what());
        }
    }
}

} // namespace

void deformCharacters(std::span<const CharacterFrame> characters, const IsCancelled& isCancelled) {
    checkDifferent(characters);
    std::vector<std::exception_ptr> failures(characters.size());
    quill::parallelFor(characters.size(), [&](std::size_t i) {
        try {
            characters[i].deformer->evaluate(characters[i].pose, characters[i].out, isCancelled);
        } catch (...) {
            failures[i] = std::current_exception();
        }
    });
    throwFirst(failures);
}

} // namespace neuralWarp
