// The table: a row for each service, sorted by any of its columns. The time lines follow its order.

function compared(a, b) {
    if (a === null || b === null) {
        return (a === null) - (b === null);
    }
    return typeof a === 'string' ? kCollator.compare(a, b) : a - b;
}

const kCollator = new Intl.Collator('en', {numeric: true});

function outagelength({lastoutage}, extent) {
    return lastoutage === null ? null : (lastoutage.to ?? extent.to) - lastoutage.from;
}

function nametext(service) {
    const name = element('span', 'name', service.name);
    name.title = service.path ? `${service.name}\n${service.path}` : service.name;
    return name;
}

// A date that is broken before its time only.
function momenttext(clock) {
    const [date, time] = clocktext(clock).split(' ');
    const shown = element('span', 'moment');
    shown.append(element('span', '', date), ' ', element('span', '', time));
    return shown;
}

// Every column: what it is called, what it sorts by, whether large comes first, and what it shows.
// Nothing sorts last either way.
const kColumns = [
    {id: 'service', title: 'Service', by: ({folded}) => folded, show: nametext},
    {id: 'state', title: 'State', by: ({now}) => now.state, largefirst: true,
     show: ({now}) => stateword(now.word, now.inferred)},
    {id: 'since', title: 'Since', by: ({now}) => now.from, largefirst: true,
     show: ({now}) => momenttext(now.fromclock)},
    {id: 'lastoutage', title: 'Last outage', by: ({lastoutage}) => lastoutage?.from ?? null,
     largefirst: true,
     show: ({lastoutage}) => (lastoutage ? momenttext(lastoutage.fromclock) : null)},
    {id: 'lasted', title: 'Its length', by: outagelength, largefirst: true, kind: 'number',
     show: (service, extent) => (service.lastoutage === null ? null :
         spantext(outagelength(service, extent)) +
             (service.lastoutage.to === null ? ', so far' : ''))},
    {id: 'outages', title: 'Outages', by: ({outages}) => outages, largefirst: true, kind: 'number',
     show: ({outages}) => counttext(outages)},
    {id: 'out', title: 'In all', by: ({outageseconds}) => outageseconds, largefirst: true,
     kind: 'number',
     show: ({outages, outageseconds}) => (outages > 0 ? spantext(outageseconds) : null)},
    {id: 'tried', title: 'Recoveries', by: ({tried}) => tried, largefirst: true, kind: 'number',
     show: ({tried, successful}) => (tried > 0 ?
         `${counttext(tried)} (${counttext(successful)} worked)` : '0')},
    {id: 'gaveup', title: 'Given up', by: ({gaveup}) => gaveup, largefirst: true, kind: 'number',
     show: ({gaveup}) => counttext(gaveup)},
    {id: 'skipped', title: 'Skipped checks', by: ({skipped}) => skipped, largefirst: true,
     kind: 'number', show: ({skipped}) => counttext(skipped)},
    {id: 'availability', title: 'Availability', by: ({availability}) => availability, kind: 'number',
     show: ({availability}) => (availability === null ? null : sharetext(availability))},
];

class Summary {
    // `sorted` is called when another order is asked for.
    constructor(table, extent, sorted) {
        this.extent = extent;
        this.sorted = sorted;
        this.by = kColumns.find(({id}) => id === 'state');
        this.downward = true;
        this.head = table.tHead.rows[0];
        this.body = table.tBodies[0];
        this.rows = new Map();
        for (const column of kColumns) {
            this.head.append(this.heading(column));
        }
        this.marksorted();
    }

    heading(column) {
        const cell = element('th', column.kind);
        cell.scope = 'col';
        cell.setAttribute('role', 'columnheader');
        const button = element('button', '', column.title);
        button.type = 'button';
        button.id = `by-${column.id}`;
        button.addEventListener('click', () => this.sort(column));
        cell.append(button);
        return cell;
    }

    // By another column, or by the same the other way round.
    sort(column) {
        this.downward = this.by === column ? !this.downward : column.largefirst === true;
        this.by = column;
        this.marksorted();
        this.sorted();
    }

    marksorted() {
        kColumns.forEach((column, i) => {
            const order = this.downward ? 'descending' : 'ascending';
            this.head.cells[i].setAttribute('aria-sort', column === this.by ? order : 'none');
        });
    }

    // The services as they are to be shown; those that are equal, by name.
    order(services) {
        const {by} = this.by;
        const sign = this.downward ? -1 : 1;
        const keyed = services.map((service) => ({service, key: by(service, this.extent)}));
        keyed.sort((a, b) => (a.key === null || b.key === null ? compared(a.key, b.key) :
            sign * compared(a.key, b.key)) || compared(a.service.folded, b.service.folded));
        return keyed.map(({service}) => service);
    }

    list(services) {
        this.body.replaceChildren(...services.map((service) => this.rowof(service)));
    }

    rowof(service) {
        if (!this.rows.has(service.id)) {
            this.rows.set(service.id, this.makerow(service));
        }
        return this.rows.get(service.id);
    }

    makerow(service) {
        const row = element('tr');
        row.setAttribute('role', 'row');
        for (const column of kColumns) {
            const first = column === kColumns[0];
            const cell = element(first ? 'th' : 'td', column.kind);
            cell.setAttribute('role', first ? 'rowheader' : 'cell');
            cell.dataset.title = column.title;
            const shown = column.show(service, this.extent);
            cell.append(shown ?? element('span', 'none', '\u2013'));
            row.append(cell);
        }
        return row;
    }
}
