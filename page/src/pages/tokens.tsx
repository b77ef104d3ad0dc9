import type { JSX } from 'preact';
import { useState } from 'preact/hooks';

import { tokens, type Token } from '../api';
import { format, formatDate, formatTime, t } from '../text';
import { announce, Button, Confirm, Dialog, ErrorNotice, Form, Select, Spinner, TextField, useAction, useLoad } from '../ui';

const NAME = /^[A-Za-z0-9_.-]{1,64}$/;
const MOST_DAYS = 3650;

export function TokensPage(): JSX.Element {
  const words = t().tokens;
  const { data, error, loading, reload } = useLoad(tokens.list);
  const [revoking, setRevoking] = useState<Token | undefined>();
  return (
    <div class="stack">
      <p class="muted">{words.lead}</p>
      <MakeToken onMade={reload} />
      <section class="card" aria-labelledby="tokens-title">
        <h2 id="tokens-title">{words.yours}</h2>
        <ErrorNotice error={error} retry={reload} />
        {!data && loading && <Spinner />}
        {data?.length === 0 && <p class="muted">{words.empty}</p>}
        {data && data.length > 0 && <TokenTable list={data} onRevoke={setRevoking} />}
      </section>
      {revoking && (
        <Confirm
          title={format(words.revokeTitle, { name: revoking.name })}
          lead={words.revokeLead}
          button={words.revoke}
          act={async () => {
            await tokens.revoke(revoking.id);
            announce(format(words.revoked, { name: revoking.name }));
            setRevoking(undefined);
            reload();
          }}
          onClose={() => setRevoking(undefined)}
        />
      )}
    </div>
  );
}

function TokenTable({ list, onRevoke }: { list: Token[]; onRevoke: (token: Token) => void }): JSX.Element {
  const words = t().tokens;
  return (
    <div class="scroll" role="region" aria-label={words.title} tabIndex={0}>
      <table class="table">
        <thead>
          <tr>
            <th scope="col">{words.name}</th>
            <th scope="col">{words.access}</th>
            <th scope="col">{words.created}</th>
            <th scope="col">{words.expires}</th>
            <th scope="col">{words.used}</th>
            <td />
          </tr>
        </thead>
        <tbody>
          {list.map((each) => (
            <tr key={each.id}>
              <th scope="row">{each.name}</th>
              <td>
                <span class={`badge ${each.access === 'full' ? 'warning' : ''}`}>{words[each.access]}</span>
              </td>
              <td>{formatDate(each.made)}</td>
              <td>{formatDate(each.expires)}</td>
              <td>{each.used === null ? words.never : formatTime(each.used)}</td>
              <td class="end">
                <Button kind="quiet" icon="trash" label={`${words.revoke}: ${each.name}`} onClick={() => onRevoke(each)} />
              </td>
            </tr>
          ))}
        </tbody>
      </table>
    </div>
  );
}

function MakeToken({ onMade }: { onMade: () => void }): JSX.Element {
  const words = t().tokens;
  const [name, setName] = useState('');
  const [access, setAccess] = useState<Token['access']>('read');
  const [days, setDays] = useState('365');
  const [tried, setTried] = useState(false);
  const [made, setMade] = useState<{ name: string; token: string } | undefined>();
  const goodName = NAME.test(name);
  const goodDays = /^\d+$/.test(days) && Number(days) >= 1 && Number(days) <= MOST_DAYS;
  const [busy, make, error] = useAction(async () => {
    const answer = await tokens.make(name, access, Number(days));
    setMade({ name, token: answer.token });
    setName('');
    setTried(false);
    onMade();
  });
  const submit = (): void => {
    setTried(true);
    if (goodName && goodDays) void make();
  };
  return (
    <section class="card" aria-label={words.make}>
      <Form class="row fields" onSubmit={submit}>
        <TextField
          label={words.name}
          hint={words.nameHint}
          value={name}
          error={tried && !goodName ? words.nameWrong : undefined}
          onInput={setName}
        />
        <Select
          label={words.access}
          value={access}
          options={[
            { value: 'read', label: words.read },
            { value: 'full', label: words.full },
          ]}
          onChange={setAccess}
        />
        <TextField
          label={words.days}
          inputMode="numeric"
          value={days}
          error={tried && !goodDays ? words.daysWrong : undefined}
          onInput={setDays}
        />
        <div class="field-button">
          <Button kind="primary" type="submit" icon="plus" busy={busy}>
            {words.make}
          </Button>
        </div>
      </Form>
      <ErrorNotice error={error} />
      {made && <ShowToken name={made.name} token={made.token} onClose={() => setMade(undefined)} />}
    </section>
  );
}

function ShowToken({ name, token, onClose }: { name: string; token: string; onClose: () => void }): JSX.Element {
  const words = t();
  const [, copy, error] = useAction(async () => {
    await navigator.clipboard.writeText(token);
    announce(words.common.copied);
  });
  return (
    <Dialog
      title={format(words.tokens.made, { name })}
      onClose={onClose}
      actions={
        <Button kind="primary" onClick={onClose}>
          {words.common.close}
        </Button>
      }
    >
      <p>{words.tokens.madeLead}</p>
      <div class="row">
        <code class="secret" tabIndex={0}>
          {token}
        </code>
        {!error && typeof navigator.clipboard !== 'undefined' && (
          <Button icon="copy" onClick={() => void copy()}>
            {words.common.copy}
          </Button>
        )}
      </div>
    </Dialog>
  );
}
