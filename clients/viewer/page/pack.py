# SPDX-License-Identifier: Apache-2.0
"""Puts the page of `quarn view` together: one file of markup, style, bundled script and core, with the licence of what
is bundled. Python of the system; nothing but its standard library.

usage: pack.py PAGE STYLE SCRIPT CORE LICENCE -o FILE
"""
import argparse
import base64
import os
import pathlib
import sys


def text_of(path: pathlib.Path) -> str:
    return path.read_text(encoding='utf-8').rstrip('\n')


def script_of(path: pathlib.Path) -> str:
    """A script that can stand between tags: a browser takes both of these for markup."""
    script = text_of(path)
    for markup in ('</script', '<!--'):
        if markup in script.lower():
            sys.exit(f'{path}: the script contains "{markup}", which would end it inside of a page')
    return script


def packed(page: str, parts: dict[str, str]) -> str:
    for mark, content in parts.items():
        if page.count(mark) != 1:
            sys.exit(f'the page has "{mark}" {page.count(mark)} times instead of once')
        page = page.replace(mark, content)
    return page


def main() -> None:
    parser = argparse.ArgumentParser(description=(__doc__ or '').partition('\n\n')[0])
    for name in ('page', 'style', 'script', 'core', 'licence'):
        parser.add_argument(name, type=pathlib.Path)
    parser.add_argument('-o', '--output', type=pathlib.Path, required=True)
    options = parser.parse_args()

    licence = text_of(options.licence).replace('--', '- -')
    page = packed(text_of(options.page) + '\n', {
        '<!-- page: licences -->': f'<!--\nthree.js, which is part of this page:\n\n{licence}\n-->',
        '/* page: style */': text_of(options.style),
        '<!-- page: core -->': base64.b64encode(options.core.read_bytes()).decode('ascii'),
        '/* page: script */': script_of(options.script),
    })
    unfinished = options.output.with_name(options.output.name + '.part')
    unfinished.write_text(page, encoding='utf-8')
    os.replace(unfinished, options.output)


if __name__ == '__main__':
    main()
