// The parts that pages are made of.
import { signal } from '@preact/signals';
import type { ComponentChildren, JSX } from 'preact';
import { useCallback, useEffect, useId, useRef, useState } from 'preact/hooks';

import { Icon, type IconName } from './icons';
import { errorText, format, t } from './text';

export { Icon, type IconName } from './icons';

interface ButtonProps {
  children?: ComponentChildren;
  kind?: 'primary' | 'danger' | 'quiet';
  icon?: IconName;
  /** name of a button that shows only its icon */
  label?: string;
  busy?: boolean;
  disabled?: boolean;
  type?: 'button' | 'submit';
  onClick?: (event: MouseEvent) => void;
  autofocus?: boolean;
  pressed?: boolean;
}

export function Button(props: ButtonProps): JSX.Element {
  const { children, kind, icon, label, busy = false, disabled = false, type = 'button' } = props;
  const alone = children === undefined;
  return (
    <button
      type={type}
      class={`button ${kind ?? ''} ${alone ? 'alone' : ''}`}
      aria-label={label}
      title={alone ? label : undefined}
      aria-busy={busy || undefined}
      aria-pressed={props.pressed}
      disabled={disabled || busy}
      autofocus={props.autofocus}
      onClick={props.onClick}
    >
      {busy ? <span class="spinner" aria-hidden="true" /> : icon && <Icon name={icon} />}
      {children !== undefined && <span>{children}</span>}
    </button>
  );
}

/** What an input inside a Field gets. */
export interface Described {
  id: string;
  'aria-describedby': string | undefined;
  'aria-invalid': boolean | undefined;
}

interface FieldProps {
  label: string;
  hint?: string | undefined;
  error?: string | undefined;
  children: (described: Described) => ComponentChildren;
}

export function Field({ label, hint, error, children }: FieldProps): JSX.Element {
  const id = useId();
  const notes = [hint && `${id}-hint`, error && `${id}-error`].filter(Boolean).join(' ');
  return (
    <div class="field">
      <label for={id}>{label}</label>
      {children({ id, 'aria-describedby': notes || undefined, 'aria-invalid': error ? true : undefined })}
      {hint && (
        <p class="hint" id={`${id}-hint`}>
          {hint}
        </p>
      )}
      {error && (
        <p class="wrong" id={`${id}-error`} role="alert">
          {error}
        </p>
      )}
    </div>
  );
}

interface TextFieldProps {
  label: string;
  value: string;
  onInput: (value: string) => void;
  hint?: string | undefined;
  error?: string | undefined;
  type?: 'text' | 'password' | 'search';
  autocomplete?: string;
  autofocus?: boolean;
  placeholder?: string;
  maxLength?: number;
  disabled?: boolean;
  inputMode?: 'text' | 'numeric' | 'decimal';
}

export function TextField({ label, hint, error, onInput, autofocus, type = 'text', ...input }: TextFieldProps): JSX.Element {
  const place = useRef<HTMLInputElement>(null);
  useEffect(() => {
    if (autofocus) place.current?.focus();
  }, [autofocus]);
  return (
    <Field label={label} hint={hint} error={error}>
      {(described) => (
        <input
          {...described}
          {...input}
          type={type as 'text'} // the types of inputs differ in what else they may have, which is the same here
          ref={place}
          spellcheck={false}
          autocapitalize="off"
          onInput={(event) => onInput(event.currentTarget.value)}
        />
      )}
    </Field>
  );
}

interface SelectProps<T extends string> {
  label: string;
  value: T;
  options: readonly { value: T; label: string }[];
  onChange: (value: T) => void;
  hint?: string;
  error?: string | undefined;
}

export function Select<T extends string>(props: SelectProps<T>): JSX.Element {
  return (
    <Field label={props.label} hint={props.hint} error={props.error}>
      {(described) => (
        <select {...described} value={props.value} onChange={(event) => props.onChange(event.currentTarget.value as T)}>
          {props.options.map((each) => (
            <option key={each.value} value={each.value}>
              {each.label}
            </option>
          ))}
        </select>
      )}
    </Field>
  );
}

/** A row of choices of which one holds. */
export function Choice<T extends string>(props: {
  label: string;
  value: T;
  options: readonly { value: T; label: string; count?: number }[];
  onChange: (value: T) => void;
}): JSX.Element {
  return (
    <div class="choice" role="group" aria-label={props.label}>
      {props.options.map((each) => (
        <button
          key={each.value}
          type="button"
          aria-pressed={each.value === props.value}
          onClick={() => props.onChange(each.value)}
        >
          {each.label}
          {each.count !== undefined && <span class="count">{each.count}</span>}
        </button>
      ))}
    </div>
  );
}

interface DialogProps {
  title: string;
  children: ComponentChildren;
  /** buttons, the one that closes first */
  actions?: ComponentChildren;
  /** Escape, or the button in the corner; without it the dialog cannot be left */
  onClose?: () => void;
  /** the dialog is a form, and its actions have a button of the type "submit" */
  onSubmit?: () => void;
}

/** Modal while it is rendered. The browser keeps the focus inside and gives it back to where it was. */
export function Dialog({ title, children, actions, onClose, onSubmit }: DialogProps): JSX.Element {
  const place = useRef<HTMLDialogElement>(null);
  const id = useId();
  useEffect(() => {
    const dialog = place.current;
    if (!dialog) return undefined;
    const before = document.activeElement;
    dialog.showModal();
    return () => {
      dialog.close();
      if (before instanceof HTMLElement && before.isConnected) before.focus();
    };
  }, []);
  const body = (
    <>
      <div class="dialog-body stack">{children}</div>
      {actions && <div class="dialog-actions">{actions}</div>}
    </>
  );
  return (
    <dialog
      ref={place}
      aria-labelledby={id}
      onCancel={(event) => {
        event.preventDefault();
        onClose?.();
      }}
    >
      <header class="dialog-head">
        <h2 id={id}>{title}</h2>
        {onClose && <Button kind="quiet" icon="close" label={t().common.close} onClick={onClose} />}
      </header>
      {onSubmit ? <Form onSubmit={onSubmit}>{body}</Form> : body}
    </dialog>
  );
}

/** A form that sends nothing by itself. */
export function Form(props: { onSubmit: () => void; children: ComponentChildren; class?: string }): JSX.Element {
  return (
    <form
      class={props.class}
      noValidate
      onSubmit={(event) => {
        event.preventDefault();
        props.onSubmit();
      }}
    >
      {props.children}
    </form>
  );
}

/** Asks before something that cannot be taken back. `act` may fail: the dialog then says so and stays. */
export function Confirm(props: {
  title: string;
  lead: string;
  button: string;
  act: () => Promise<unknown>;
  onClose: () => void;
}): JSX.Element {
  const [busy, run, error] = useAction(props.act);
  return (
    <Dialog
      title={props.title}
      onClose={props.onClose}
      actions={
        <>
          <Button onClick={props.onClose}>{t().common.cancel}</Button>
          <Button kind="danger" busy={busy} onClick={() => void run()}>
            {props.button}
          </Button>
        </>
      }
    >
      <p>{props.lead}</p>
      <ErrorNotice error={error} />
    </Dialog>
  );
}

interface NoticeProps {
  kind?: 'info' | 'ok' | 'warning' | 'error';
  children: ComponentChildren;
  actions?: ComponentChildren;
}

export function Notice({ kind = 'info', children, actions }: NoticeProps): JSX.Element {
  const icons = { info: 'info', ok: 'check', warning: 'warning', error: 'warning' } as const;
  return (
    <div class={`notice ${kind}`} role={kind === 'error' ? 'alert' : 'status'}>
      <Icon name={icons[kind]} />
      <div class="notice-text">{children}</div>
      {actions}
    </div>
  );
}

/** Nothing when there is no error. */
export function ErrorNotice({ error, retry }: { error: unknown; retry?: () => void }): JSX.Element | null {
  if (error === undefined || error === null) return null;
  const again = retry && (
    <Button icon="refresh" onClick={retry}>
      {t().common.retry}
    </Button>
  );
  return (
    <Notice kind="error" actions={again}>
      {errorText(error)}
    </Notice>
  );
}

export function Spinner({ label = t().common.loading }: { label?: string }): JSX.Element {
  return (
    <p class="loading" role="status">
      <span class="spinner" aria-hidden="true" />
      {label}
    </p>
  );
}

/** @param value  0 to 1; none: nobody knows how far it is */
export function Progress({ value, label }: { value?: number | undefined; label: string }): JSX.Element {
  return (
    <div class="progress">
      <progress aria-label={label} max={1} value={value} />
      <span class="muted">{label}</span>
    </div>
  );
}

export interface Sort {
  column: string;
  down: boolean;
}

/** A column's head that sorts by it; pressed again it turns the order round. */
export function SortHead(props: {
  column: string;
  label: string;
  sort: Sort;
  onSort: (sort: Sort) => void;
  class?: string;
}): JSX.Element {
  const { column, label, sort, onSort } = props;
  const active = sort.column === column;
  return (
    <th scope="col" class={props.class} aria-sort={active ? (sort.down ? 'descending' : 'ascending') : 'none'}>
      <button
        type="button"
        class="sort"
        title={format(t().common.sortBy, { column: label })}
        onClick={() => onSort({ column, down: active && !sort.down })}
      >
        {label}
        {active && <Icon name={sort.down ? 'down' : 'up'} size={14} />}
      </button>
    </th>
  );
}

export interface Load<T> {
  data: T | undefined;
  error: unknown;
  loading: boolean;
  reload: () => void;
}

/** Runs `fn` when the component appears and at each reload; what was loaded before stays until it is replaced. */
export function useLoad<T>(fn: () => Promise<T>): Load<T> {
  const [state, setState] = useState<{ data?: T; error?: unknown; loading: boolean }>({ loading: true });
  const run = useRef(0);
  const latest = useRef(fn);
  latest.current = fn;
  const reload = useCallback(() => {
    const mine = ++run.current;
    setState((before) => ({ ...before, loading: true }));
    latest.current().then(
      (data) => mine === run.current && setState({ data, loading: false }),
      (error: unknown) => mine === run.current && setState((before) => ({ ...before, error, loading: false })),
    );
  }, []);
  useEffect(() => {
    reload();
    return () => {
      run.current = -1; // what comes now comes too late
    };
  }, [reload]);
  return { data: state.data, error: state.error, loading: state.loading, reload };
}

/** One thing that a person does: [busy, run, error]. `run` is true when it went well. */
export function useAction<A extends unknown[]>(
  fn: (...values: A) => Promise<unknown>,
): [boolean, (...values: A) => Promise<boolean>, unknown, (error: unknown) => void] {
  const [busy, setBusy] = useState(false);
  const [error, setError] = useState<unknown>(undefined);
  const run = async (...values: A): Promise<boolean> => {
    setBusy(true);
    setError(undefined);
    try {
      await fn(...values);
      return true;
    } catch (fault) {
      setError(fault);
      return false;
    } finally {
      setBusy(false);
    }
  };
  return [busy, run, error, setError];
}

// ---- what is said in passing

const said = signal({ text: '', id: 0 });
const SHOWN = 5000; // milliseconds

/** Shows a short message at the page's edge, and has a screen reader say it. */
export function announce(text: string): void {
  const id = said.value.id + 1;
  said.value = { text, id };
  setTimeout(() => {
    if (said.value.id === id) said.value = { text: '', id };
  }, SHOWN);
}

export function Announcements(): JSX.Element {
  return (
    <div class="toast" role="status" data-shown={said.value.text !== ''}>
      {said.value.text}
    </div>
  );
}
