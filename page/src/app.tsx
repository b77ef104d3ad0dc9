// The frame around the pages: who may see them, and how to get from one to another.
import type { JSX } from 'preact';
import { useEffect, useRef } from 'preact/hooks';

import { ApiError, logout, resume } from './api';
import { bringIntoSight, lessMotion } from './logic/sight';
import { pages, type PageEntry } from './pages';
import { FirstPassword, SignIn, SignInAgain } from './pages/signin';
import { formatRoute, route } from './route';
import { session } from './session';
import { Preferences } from './preferences';
import { t } from './text';
import { Announcements, Button, ErrorNotice, Icon, Spinner, useAction, useLoad } from './ui';

export function App(): JSX.Element {
  const { state } = session.value;
  return (
    <>
      {state === 'unknown' && <Start />}
      {state === 'out' && <SignIn />}
      {state === 'first' && <FirstPassword />}
      {(state === 'in' || state === 'expired') && <Frame />}
      {state === 'expired' && <SignInAgain />}
      <Announcements />
    </>
  );
}

const TRY_AGAIN = 3000; // milliseconds

/** Until the router has said whether there is a session. */
function Start(): JSX.Element {
  const { error, reload } = useLoad(resume);
  useEffect(() => {
    if (error === undefined) return undefined;
    const timer = setTimeout(reload, error instanceof ApiError && error.wait > 0 ? error.wait * 1000 : TRY_AGAIN);
    return () => clearTimeout(timer);
  }, [error, reload]);
  return (
    <main class="centre">
      <Spinner label={t().signin.looking} />
      <ErrorNotice error={error} retry={reload} />
    </main>
  );
}

function Frame(): JSX.Element {
  const first = pages[0] as PageEntry;
  const page = pages.find((each) => each.id === route.value.page) ?? first;
  const head = useRef<HTMLHeadingElement>(null);
  const shown = useRef(page.id);
  const title = page.title(t());
  useEffect(() => {
    document.title = `${title} · ${t().common.router}`;
  }, [title]);
  useEffect(() => {
    // A screen reader then reads where one is. The window goes to its top by itself, and nothing else that glides is stopped.
    if (shown.current !== page.id) head.current?.focus({ preventScroll: true });
    shown.current = page.id;
    window.scrollTo(0, 0);
  }, [page.id]);
  const Page = page.component;
  return (
    <div class="frame">
      <a class="skip" href="#content" onClick={(event) => (event.preventDefault(), head.current?.focus())}>
        {t().nav.skip}
      </a>
      <Side current={page.id} />
      <main class="content" id="content">
        <h1 ref={head} tabIndex={-1}>
          {title}
        </h1>
        <Page key={page.id} />
      </main>
    </div>
  );
}

function Side({ current }: { current: string }): JSX.Element {
  const [busy, leave, error] = useAction(logout);
  const links = useRef<HTMLElement>(null);
  const arrived = useRef(false);
  const texts = t();
  useEffect(() => {
    // On a telephone the links are a row that moves sideways. Another language makes them wider or narrower.
    const row = links.current;
    if (row) bringIntoSight(row, row.querySelector('[aria-current]'), arrived.current && !lessMotion());
    arrived.current = true;
  }, [current, texts]);
  return (
    <header class="side">
      <div class="brand">
        <Icon name="topology" size={22} />
        <span>{t().common.router}</span>
      </div>
      <nav ref={links} aria-label={t().nav.label}>
        <ul>
          {pages.map((each) => (
            <li key={each.id}>
              <a
                href={formatRoute({ page: each.id, choices: new Map() })}
                aria-current={each.id === current ? 'page' : undefined}
              >
                <Icon name={each.icon} />
                <span>{each.title(t())}</span>
              </a>
            </li>
          ))}
        </ul>
      </nav>
      <div class="side-foot">
        <Preferences />
        <Button kind="quiet" icon="signout" busy={busy} onClick={() => void leave()}>
          {t().nav.signOut}
        </Button>
        <ErrorNotice error={error} />
      </div>
    </header>
  );
}
