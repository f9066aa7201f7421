// SPDX-License-Identifier: Apache-2.0
/** What went wrong, as a plain sentence for whoever looks at the page. */
export class Failure extends Error {}
