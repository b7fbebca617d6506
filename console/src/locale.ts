import { i18n } from '@lingui/core';

// The catalogue of the source language has only the texts with values: all others are their own keys.
i18n.setMessagesCompiler((text) => [text]);

export const languages = { en: 'English', de: 'Deutsch' } as const;
export type Language = keyof typeof languages;

const isLanguage = (text: string | null): text is Language => text !== null && text in languages;

/** The chosen language, else the first one of the browser's that there is a catalogue for. */
function preferred(): Language {
  const chosen = localStorage.getItem('language');
  if (isLanguage(chosen)) return chosen;
  return navigator.languages.map((tag) => tag.slice(0, 2)).find(isLanguage) ?? 'en';
}

/** Shows the page in a language, and remembers it. */
export async function activate(language: Language) {
  const { messages } = language === 'de' ? await import('./locales/de.po') : await import('./locales/en.po');
  // Times and numbers are written as in the region of the browser.
  const regions = navigator.languages.filter((tag) => tag.startsWith(language));
  i18n.loadAndActivate({ locale: language, locales: [...regions, language], messages });
  document.documentElement.lang = language;
}

export async function choose(language: Language) {
  localStorage.setItem('language', language);
  await activate(language);
}

export const activatePreferred = () => activate(preferred());
