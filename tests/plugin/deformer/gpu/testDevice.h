// SPDX-License-Identifier: Apache-2.0
#pragma once

/// Closes the device and chooses the one that the environment's NW_TEST_DEVICE names, as Gpu::chooseDevice() takes it;
/// the first when there is no such variable. Done before the first test.
void chooseTestDevice();
