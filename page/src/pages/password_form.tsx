// Changing the password: on the account page, and before anything else at the first sign-in.
import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import { ApiError, changePassword } from '../api';
import { checkPassword } from '../password';
import { t } from '../text';
import { Button, ErrorNotice, Form, TextField, useAction } from '../ui';

interface Props {
  /** the present password, when the person has just typed it */
  old?: string | undefined;
  onDone: () => void;
}

export function PasswordForm({ old: known, onDone }: Props): JSX.Element {
  const words = t().account;
  const [old, setOld] = useState('');
  const [fresh, setFresh] = useState('');
  const [again, setAgain] = useState('');
  const [tried, setTried] = useState(false);
  const [busy, change, error, setError] = useAction(changePassword);
  const present = known ?? old;
  const fault = checkPassword(present, fresh);
  const wrongOld = error instanceof ApiError && error.status === 401;

  const submit = async (): Promise<void> => {
    setTried(true);
    if (fault || again !== fresh || !(await change(present, fresh))) return;
    setOld('');
    setFresh('');
    setAgain('');
    setTried(false);
    onDone();
  };
  return (
    <Form class="stack narrow" onSubmit={() => void submit()}>
      <input class="hidden" type="text" name="username" autocomplete="username" value="admin" readOnly tabIndex={-1} aria-hidden="true" />
      {known === undefined && (
        <TextField
          label={words.old}
          type="password"
          autocomplete="current-password"
          value={old}
          error={wrongOld ? words.wrongOld : undefined}
          onInput={(value) => (setOld(value), setError(undefined))}
        />
      )}
      <TextField
        label={words.fresh}
        type="password"
        autocomplete="new-password"
        hint={words.hint}
        value={fresh}
        error={tried && fault ? words[fault] : undefined}
        onInput={setFresh}
        autofocus={known !== undefined}
      />
      <TextField
        label={words.repeat}
        type="password"
        autocomplete="new-password"
        value={again}
        error={tried && again !== fresh ? words.differ : undefined}
        onInput={setAgain}
      />
      {!(wrongOld && known === undefined) && <ErrorNotice error={error} />}
      <div class="row">
        <Button kind="primary" type="submit" busy={busy}>
          {words.change}
        </Button>
      </div>
    </Form>
  );
}
