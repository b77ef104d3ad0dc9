import type { JSX } from 'preact';

import { Preferences } from '../preferences';
import { session } from '../session';
import { format, t } from '../text';
import { announce } from '../ui';
import { PasswordForm } from './password_form';

export function AccountPage(): JSX.Element {
  const words = t().account;
  return (
    <div class="stack">
      <p class="muted">{format(words.signedInAs, { user: session.value.user })}</p>
      <section class="card stack" aria-labelledby="password-title">
        <div>
          <h2 id="password-title">{words.passwordTitle}</h2>
          <p class="muted">{words.passwordLead}</p>
        </div>
        <PasswordForm onDone={() => announce(words.changed)} />
      </section>
      <section class="card stack" aria-labelledby="page-title">
        <h2 id="page-title">{words.pageTitle}</h2>
        <Preferences />
      </section>
    </div>
  );
}
