// SPDX-License-Identifier: Apache-2.0
#include "viewer/Blocks.h"

#include "storage/Fnv64.h"

#include <utility>

namespace viewer {
namespace {

std::string quoted(std::string_view name) {
    return "the block \"" + std::string(name) + '"';
}

} // namespace

void Blocks::add(std::string name, std::vector<std::byte> bytes) {
    const auto owner = std::make_shared<const std::vector<std::byte>>(std::move(bytes));
    add(std::move(name), std::shared_ptr<const std::byte>(owner, owner->data()), owner->size());
}

void Blocks::add(std::string name, std::shared_ptr<const std::byte> bytes, std::size_t size) {
    if (has(name))
        throw std::runtime_error(quoted(name) + " is there twice");
    storage::Fnv64 sum;
    sum.add({bytes.get(), size});
    blocks_.emplace(std::move(name), Block{std::move(bytes), size, sum.value()});
}

std::span<const std::byte> Blocks::bytes(std::string_view name) const {
    const Block& block = find(name);
    return {block.bytes.get(), block.size};
}

void Blocks::forgetBytes() {
    for (auto& [name, block] : blocks_)
        block = {nullptr, 0, block.sum};
}

const Blocks::Block& Blocks::find(std::string_view name) const {
    const auto at = blocks_.find(name);
    if (at == blocks_.end())
        throw std::runtime_error(quoted(name) + " is missing");
    return at->second;
}

std::string Blocks::unwhole(std::string_view name, std::size_t size, std::size_t each) {
    return quoted(name) + " has " + std::to_string(size) + " bytes, which are no whole numbers of " +
           std::to_string(each);
}

} // namespace viewer
