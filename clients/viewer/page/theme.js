// SPDX-License-Identifier: Apache-2.0
// Light or dark: as the system says, until the user says otherwise.
const system = matchMedia('(prefers-color-scheme: dark)');
let chosen = null;

/** Follows the system. The answer switches by hand. */
export function followTheme() {
  const apply = () => {
    document.documentElement.dataset.theme = chosen ?? (system.matches ? 'dark' : 'light');
  };
  system.addEventListener('change', apply);
  apply();
  return () => {
    chosen = document.documentElement.dataset.theme === 'dark' ? 'light' : 'dark';
    apply();
  };
}
