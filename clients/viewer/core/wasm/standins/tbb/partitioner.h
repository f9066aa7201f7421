// SPDX-License-Identifier: Apache-2.0
#pragma once

namespace tbb {

class auto_partitioner {};
class simple_partitioner {};

} // namespace tbb
