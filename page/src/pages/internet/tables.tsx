import type { JSX } from 'preact';

import type { Family } from '../../logic/ip';
import { getTables } from '../../router';
import { t } from '../../text';
import { ErrorNotice, Spinner, useLoad } from '../../ui';

export function Tables({ family }: { family: Family }): JSX.Element {
  const texts = t().internet;
  const { data, error, loading, reload } = useLoad(() => getTables(family));
  return (
    <details class="card tables">
      <summary>
        <h2>{texts.tables}</h2>
      </summary>
      <div class="stack">
        <p class="lead">{texts.tablesLead}</p>
        <ErrorNotice error={error} retry={reload} />
        {!data && loading && <Spinner />}
        {data && (
          <table class="table narrow">
            <thead>
              <tr>
                <th scope="col" class="end">
                  {texts.tableId}
                </th>
                <th scope="col">{texts.tableName}</th>
              </tr>
            </thead>
            <tbody>
              {data.map((table) => (
                <tr key={table.id}>
                  <td class="number end">{table.id}</td>
                  <td>{table.name}</td>
                </tr>
              ))}
            </tbody>
          </table>
        )}
      </div>
    </details>
  );
}
