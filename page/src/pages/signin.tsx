// Sign in: as a page of its own, and as a dialog over a page whose session has ended.
import { signal } from '@preact/signals';
import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import { ApiError, login, logout } from '../api';
import { Preferences } from '../preferences';
import { t } from '../text';
import { announce, Button, Dialog, ErrorNotice, Form, Icon, Notice, TextField, useAction } from '../ui';
import { PasswordForm } from './password_form';

/** Kept only from the sign-in to the change that must follow it, so that nobody types the first password twice. */
const typedPassword = signal<string | undefined>(undefined);

function useSignIn() {
  const [user, setUser] = useState('admin');
  const [password, setPassword] = useState('');
  const [busy, run, error] = useAction(async () => {
    typedPassword.value = password;
    await login(user, password);
  });
  const wrong = error instanceof ApiError && error.status === 401;
  const fields = (
    <>
      <TextField label={t().signin.user} value={user} autocomplete="username" onInput={setUser} />
      <TextField
        label={t().signin.password}
        type="password"
        autocomplete="current-password"
        value={password}
        autofocus
        onInput={setPassword}
      />
      {wrong ? <Notice kind="error">{t().signin.wrong}</Notice> : <ErrorNotice error={error} />}
    </>
  );
  const button = (
    <Button kind="primary" type="submit" busy={busy}>
      {t().signin.button}
    </Button>
  );
  return { fields, button, submit: () => void run() };
}

function Card({ title, lead, children }: { title: string; lead: string; children: JSX.Element }): JSX.Element {
  return (
    <main class="centre">
      <div class="card sign-in stack">
        <div class="brand">
          <Icon name="topology" size={26} />
          <span>{t().common.router}</span>
        </div>
        <div>
          <h1>{title}</h1>
          <p class="muted">{lead}</p>
        </div>
        {children}
      </div>
      <Preferences />
    </main>
  );
}

export function SignIn(): JSX.Element {
  const { fields, button, submit } = useSignIn();
  return (
    <Card title={t().signin.title} lead={t().signin.lead}>
      <Form class="stack" onSubmit={submit}>
        {fields}
        {button}
        <p class="hint">{t().signin.firstHint}</p>
      </Form>
    </Card>
  );
}

export function SignInAgain(): JSX.Element {
  const { fields, button, submit } = useSignIn();
  const [busy, leave] = useAction(logout);
  return (
    <Dialog
      title={t().signin.title}
      onSubmit={submit}
      actions={
        <>
          <Button kind="quiet" busy={busy} onClick={() => void leave()}>
            {t().nav.signOut}
          </Button>
          {button}
        </>
      }
    >
      <p>{t().signin.expired}</p>
      {fields}
    </Dialog>
  );
}

export function FirstPassword(): JSX.Element {
  const done = (): void => {
    typedPassword.value = undefined;
    announce(t().account.changed);
  };
  return (
    <Card title={t().signin.firstTitle} lead={t().signin.firstLead}>
      <PasswordForm old={typedPassword.value} onDone={done} />
    </Card>
  );
}
