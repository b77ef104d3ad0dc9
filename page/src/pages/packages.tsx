// Recommended packages. What the package server answers is its own: only texts are taken from it.
import type { JSX } from 'preact';

import { type Package, packagesOf } from '../logic/packages';
import { getPackages } from '../router';
import { t } from '../text';
import { Button, Icon, Notice, Spinner, useLoad } from '../ui';
import './packages.css';

export function PackagesPage(): JSX.Element {
  const texts = t().packages;
  const { data, error, loading, reload } = useLoad(getPackages);
  const list = data === undefined ? undefined : packagesOf(data);
  return (
    <div class="stack">
      <p class="lead">{texts.lead}</p>
      {data === undefined && loading && <Spinner />}
      {error !== undefined && (
        <Notice
          kind="error"
          actions={
            <Button icon="refresh" busy={loading} onClick={reload}>
              {t().common.retry}
            </Button>
          }
        >
          <p>{texts.failed}</p>
          <a href="#/internet">{texts.toInternet}</a>
        </Notice>
      )}
      {data !== undefined && !list && <Notice kind="warning">{texts.strange}</Notice>}
      {list?.length === 0 && <Notice>{texts.none}</Notice>}
      {list && list.length > 0 && (
        <ul class="packages">
          {list.map((each) => (
            <PackageCard key={each.id} item={each} />
          ))}
        </ul>
      )}
    </div>
  );
}

function PackageCard({ item }: { item: Package }): JSX.Element {
  return (
    <li class="card package">
      <span class="package-icon">
        <Icon name="packages" size={24} />
      </span>
      <div>
        <h2 class="wrap">{item.name}</h2>
        {item.about && <p class="muted wrap">{item.about}</p>}
      </div>
    </li>
  );
}
