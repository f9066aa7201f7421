// SPDX-License-Identifier: Apache-2.0
// A library that has nothing to do with the host.
extern "C" int somethingElse();
extern "C" __attribute__((visibility("default"))) int somethingElse() {
    return 3;
}
