// SPDX-License-Identifier: Apache-2.0
//
// Run before each file of tests: what is waited for may take longer than a second on a busy machine.

const waitFor = vi.waitFor;
vi.waitFor = (condition, options = 10_000) => waitFor(condition, options);
