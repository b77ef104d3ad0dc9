// Language and appearance.
import type { JSX } from 'preact';

import { chooseLanguage, chooseTheme, language, theme } from './settings';
import { t } from './text';
import { Select } from './ui';

export function Preferences(): JSX.Element {
  return (
    <div class="preferences">
      <Select
        label={t().nav.language}
        value={language.value}
        options={[
          { value: 'en', label: 'English' },
          { value: 'de', label: 'Deutsch' },
        ]}
        onChange={chooseLanguage}
      />
      <Select
        label={t().nav.theme}
        value={theme.value}
        options={[
          { value: 'auto', label: t().nav.themeAuto },
          { value: 'light', label: t().nav.themeLight },
          { value: 'dark', label: t().nav.themeDark },
        ]}
        onChange={chooseTheme}
      />
    </div>
  );
}
