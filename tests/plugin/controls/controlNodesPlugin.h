// SPDX-License-Identifier: Apache-2.0
#pragma once

/// Registers the catalogue and the three control nodes with the session that is open; they go with it.
void addControlNodes();
