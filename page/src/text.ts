// The words of the page in the chosen language.
import { ApiError } from './api';
import { language, type Language } from './settings';
import { de } from './texts/de';
import { en, type Texts } from './texts/en';

export type { Texts } from './texts/en';

const all: Record<Language, Texts> = { en, de };

/** A component that calls it is drawn anew when the language changes. */
export function t(): Texts {
  return all[language.value];
}

/** Puts values in the places of a text: format("{count} devices", {count: 3}). */
export function format(text: string, values: Record<string, string | number>): string {
  return text.replace(/\{(\w+)\}/g, (place, name: string) => String(values[name] ?? place));
}

/** What went wrong and what to do next, for a person. */
export function errorText(error: unknown): string {
  const words = t().errors;
  if (!(error instanceof ApiError)) return words.page;
  if (error.status === 429 && error.wait > 0) return format(words.waitSeconds, { seconds: error.wait });
  const known: Record<number, string> = words.codes;
  return known[error.code] ?? known[error.status] ?? format(words.unknown, { code: error.code });
}

export function formatTime(unix: number): string {
  return new Date(unix * 1000).toLocaleString(language.value, { dateStyle: 'medium', timeStyle: 'short' });
}

export function formatDate(unix: number): string {
  return new Date(unix * 1000).toLocaleDateString(language.value, { dateStyle: 'medium' });
}
