import { describe, expect, it } from 'vitest';

import { ApiError } from '../src/api';
import { chooseLanguage } from '../src/settings';
import { errorText, format } from '../src/text';
import { de } from '../src/texts/de';
import { en } from '../src/texts/en';

/** Every text of a language with where it stands. */
function flat(value: unknown, at = ''): [string, string][] {
  if (typeof value === 'string') return [[at, value]];
  return Object.entries(value as object).flatMap(([name, each]) => flat(each, `${at}.${name}`));
}

describe('the texts', () => {
  it('have the same places in every language', () => {
    const german = new Map(flat(de));
    for (const [at, text] of flat(en)) {
      const places = (of: string): string[] => (of.match(/\{\w+\}/g) ?? []).sort();
      expect(places(german.get(at) ?? ''), at).toEqual(places(text));
    }
  });
  it('are never empty', () => {
    for (const [at, text] of [...flat(en), ...flat(de)]) expect(text.trim(), at).not.toBe('');
  });
});

describe('format', () => {
  it('puts values in and never looks at them again', () => {
    expect(format('{name} has {count}', { name: '{count}', count: 3 })).toBe('{count} has 3');
  });
  it('leaves a place without a value as it is', () => {
    expect(format('{a}{b}', { a: 1 })).toBe('1{b}');
  });
});

describe('errorText', () => {
  it('speaks of the code that the module gave', () => {
    chooseLanguage('en');
    expect(errorText(new ApiError(200, 4302, undefined))).toBe(en.errors.codes[4302]);
    chooseLanguage('de');
    expect(errorText(new ApiError(0, 0, undefined))).toBe(de.errors.codes[0]);
  });
  it('says how long to wait', () => {
    chooseLanguage('en');
    expect(errorText(new ApiError(429, 429, undefined, '', 7))).toContain('7 seconds');
  });
  it('has words for a code that it does not know and for what is no answer', () => {
    chooseLanguage('en');
    expect(errorText(new ApiError(200, 9999, undefined))).toContain('9999');
    expect(errorText(new TypeError('x'))).toBe(en.errors.page);
  });
});
