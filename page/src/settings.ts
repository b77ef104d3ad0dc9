// What a person chose for this browser. A browser that keeps nothing (private windows may refuse) still works.
import { effect, signal } from '@preact/signals';

export type Theme = 'auto' | 'light' | 'dark';
export const LANGUAGES = ['en', 'de'] as const;
export type Language = (typeof LANGUAGES)[number];

function read(key: string): string | null {
  try {
    return localStorage.getItem(key);
  } catch {
    return null;
  }
}

function write(key: string, value: string): void {
  try {
    localStorage.setItem(key, value);
  } catch {
    // not kept, that is all
  }
}

function browserLanguage(): Language {
  const wanted = typeof navigator === 'undefined' ? [] : navigator.languages;
  for (const each of wanted) {
    const known = LANGUAGES.find((language) => each.toLowerCase().startsWith(language));
    if (known) return known;
  }
  return 'en';
}

const storedTheme = read('vorn-theme');
const storedLanguage = read('vorn-language');

export const theme = signal<Theme>(storedTheme === 'light' || storedTheme === 'dark' ? storedTheme : 'auto');
export const language = signal<Language>(
  LANGUAGES.find((each) => each === storedLanguage) ?? browserLanguage(),
);

export function chooseTheme(value: Theme): void {
  theme.value = value;
  write('vorn-theme', value);
}

export function chooseLanguage(value: Language): void {
  language.value = value;
  write('vorn-language', value);
}

/** Keeps the document's own attributes true. */
export function followSettings(): void {
  effect(() => {
    document.documentElement.dataset['theme'] = theme.value;
  });
  effect(() => {
    document.documentElement.lang = language.value;
  });
}
